#include "Tools/reportctl/store/RowText.h"

#include <algorithm>

#include <fmt/format.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "SystemTool/Text/Utf8.h"
#include "Tools/reportctl/store/Csv.h"

namespace reportctl::store {
namespace {

/// The text as valid UTF-8. The service stores only valid UTF-8, but other programs may write into the store.
class Utf8 {
public:
    explicit Utf8(std::string_view text) : m_text(text) {
        if (SystemTool::Text::IsAscii(text))
            return;
        m_repaired = SystemTool::Text::ValidUtf8(text);
        m_text = m_repaired;
    }
    ~Utf8() = default;
    Utf8(const Utf8&) = delete;
    Utf8& operator=(const Utf8&) = delete;

    std::string_view Text() const { return m_text; }

private:
    std::string m_repaired;
    std::string_view m_text;
};

void AppendField(std::string& out, const ReportRow::Text& text) {
    if (text)
        AppendCsvField(out, Utf8(*text).Text());
}

using Writer = rapidjson::Writer<rapidjson::StringBuffer>;

void WriteText(Writer& writer, const char* name, const ReportRow::Text& text) {
    writer.Key(name);
    if (!text) {
        writer.Null();
        return;
    }
    const Utf8 utf8(*text);
    writer.String(utf8.Text().data(), static_cast<rapidjson::SizeType>(utf8.Text().size()));
}

/// Writes the JSON unchanged, but on one line. A line's end can become a space, because in valid JSON it is
/// always white space between tokens.
void WriteJson(Writer& writer, const char* name, std::string_view json) {
    writer.Key(name);
    std::string line(Utf8(json).Text());
    std::replace(line.begin(), line.end(), '\n', ' ');
    std::replace(line.begin(), line.end(), '\r', ' ');
    writer.RawValue(line.data(), line.size(), rapidjson::kObjectType);
}

} // namespace

void AppendCsv(std::string& out, const ReportRow& row) {
    fmt::format_to(std::back_inserter(out), "{}", row.id);
    for (const auto* field : {&row.at, &row.event, &row.module, &row.action, &row.value, &row.openid,
                              &row.suiteVersion, &row.createTime}) {
        out += ',';
        AppendField(out, *field);
    }
    out += '\n';
}

void AppendJsonLine(std::string& out, const ReportRow& row) {
    rapidjson::StringBuffer line;
    Writer writer(line);
    writer.StartObject();
    writer.Key("id");
    writer.Int64(row.id);
    WriteText(writer, "at", row.at);
    WriteText(writer, "event", row.event);
    WriteText(writer, "module", row.module);
    WriteText(writer, "action", row.action);
    if (row.isJson)
        WriteJson(writer, "value", *row.value);
    else
        WriteText(writer, "value", row.value);
    WriteText(writer, "openid", row.openid);
    WriteText(writer, "suite_version", row.suiteVersion);
    WriteText(writer, "create_time", row.createTime);
    writer.EndObject();
    out.append(line.GetString(), line.GetSize());
    out += '\n';
}

} // namespace reportctl::store
