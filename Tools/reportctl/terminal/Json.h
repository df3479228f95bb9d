#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

namespace reportctl::terminal {

/// JSON text that a terminal may show: the control characters that JSON lets stand as they are (U+007F to
/// U+009F) are escaped.
std::string ShownJson(std::string_view json);

/// One JSON object on one line, its members in the order in which they are added. What is no UTF-8 becomes
/// U+FFFD.
class JsonObject {
public:
    JsonObject() : m_writer(m_text) { m_writer.StartObject(); }

    void Add(const char* key, std::string_view text);
    void Add(const char* key, std::int64_t number);
    void AddNull(const char* key);

    /// Null for an empty text.
    void AddOrNull(const char* key, std::string_view text);

    /// The object, without a line feed. The last call.
    std::string Take();

private:
    rapidjson::StringBuffer m_text;
    rapidjson::Writer<rapidjson::StringBuffer> m_writer;
};

} // namespace reportctl::terminal
