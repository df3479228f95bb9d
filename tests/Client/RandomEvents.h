#pragma once

#include <cstdint>
#include <random>
#include <string>

/// A random event, of a kind that no written test covers.
struct RandomEvent {
    enum class Kind { Nothing, Text, Json };

    std::string id;
    Kind kind = Kind::Nothing;
    std::string value;
};

/// Makes events of texts that could change on their way to the table: quotes, percent signs, control
/// characters, bytes that are not UTF-8, zero bytes, "eventID", escapes, numbers of many digits, white space,
/// and texts of 10 KB. The same seed makes the same events.
class RandomEvents {
public:
    explicit RandomEvents(std::uint64_t seed) : m_random(seed) {}

    RandomEvent Next();

private:
    /// A number from 0 to `end` - 1.
    std::size_t Below(std::size_t end) { return static_cast<std::size_t>(m_random() % end); }
    bool OneIn(std::size_t cases) { return Below(cases) == 0; }

    std::string Id();
    std::string Text(std::size_t pieces);
    std::string LongText();
    std::string Json(int levels);
    std::string JsonObject(int levels);
    std::string JsonString();
    std::string JsonNumber();
    std::string Space();

    std::mt19937_64 m_random;
};
