#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

namespace reportctl::terminal {

/// The JSON text as a terminal may show it. JSON allows the control characters U+007F to U+009F without an
/// escape; here they are escaped.
std::string ShownJson(std::string_view json);

/// Writes one JSON object on one line. Its members are in the order in which they are added. Bytes that are
/// not UTF-8 become U+FFFD.
class JsonObject {
public:
    JsonObject() : m_writer(m_text) { m_writer.StartObject(); }

    void Add(const char* key, std::string_view text);
    void Add(const char* key, std::int64_t number);
    void AddBool(const char* key, bool value);
    void AddNull(const char* key);

    /// Adds the text, or null when the text is empty.
    void AddOrNull(const char* key, std::string_view text);

    /// Ends the object and returns it, without a line feed. Call it last, and once.
    std::string Take();

private:
    rapidjson::StringBuffer m_text;
    rapidjson::Writer<rapidjson::StringBuffer> m_writer;
};

} // namespace reportctl::terminal
