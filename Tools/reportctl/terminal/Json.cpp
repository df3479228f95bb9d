#include "Tools/reportctl/terminal/Json.h"

#include <fmt/format.h>

#include "SystemTool/Text/Utf8.h"

namespace reportctl::terminal {

std::string ShownJson(std::string_view json) {
    constexpr auto DELETE = '\x7f';
    constexpr auto LEAD_OF_C1 = '\xc2'; // U+0080 to U+009F are this byte and a byte from 0x80 to 0x9f
    std::string shown;
    shown.reserve(json.size());
    for (std::size_t at = 0; at < json.size(); ++at) {
        const auto next = static_cast<unsigned char>(at + 1 < json.size() ? json[at + 1] : 0);
        if (json[at] == DELETE)
            shown += "\\u007f";
        else if (json[at] == LEAD_OF_C1 && next < 0xa0)
            shown += fmt::format("\\u00{:02x}", next), ++at;
        else
            shown += json[at];
    }
    return shown;
}

void JsonObject::Add(const char* key, std::string_view text) {
    const auto utf8 = SystemTool::Text::ValidUtf8(text);
    m_writer.Key(key);
    m_writer.String(utf8.data(), static_cast<rapidjson::SizeType>(utf8.size()));
}

void JsonObject::Add(const char* key, std::int64_t number) {
    m_writer.Key(key);
    m_writer.Int64(number);
}

void JsonObject::AddBool(const char* key, bool value) {
    m_writer.Key(key);
    m_writer.Bool(value);
}

void JsonObject::AddNull(const char* key) {
    m_writer.Key(key);
    m_writer.Null();
}

void JsonObject::AddOrNull(const char* key, std::string_view text) {
    text.empty() ? AddNull(key) : Add(key, text);
}

std::string JsonObject::Take() {
    m_writer.EndObject();
    return ShownJson({m_text.GetString(), m_text.GetSize()});
}

} // namespace reportctl::terminal
