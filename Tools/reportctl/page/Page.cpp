#include "Tools/reportctl/page/Page.h"

#include <random>
#include <string_view>

#include <fmt/format.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "SystemTool/Text/Utf8.h"

namespace embedded {
std::string_view PageHtml();
std::string_view PageCss();
std::string_view PageJs();
std::string_view ChartJs();
} // namespace embedded

namespace reportctl::page {
namespace {

using Writer = rapidjson::Writer<rapidjson::StringBuffer>;

/// An event id may have ten thousand bytes, but a person reads only its beginning.
constexpr std::size_t MAX_KEY_BYTES = 200;

void WriteText(Writer& writer, std::string_view text) {
    writer.String(text.data(), static_cast<rapidjson::SizeType>(text.size()));
}

void WriteCounts(Writer& writer, const char* name, const std::vector<store::Count>& counts) {
    writer.Key(name);
    writer.StartArray();
    for (const auto& [key, count] : counts) {
        writer.StartObject();
        writer.Key("key");
        if (key)
            WriteText(writer, SystemTool::Text::ValidUtf8(SystemTool::Text::CutUtf8(*key, MAX_KEY_BYTES)));
        else
            writer.Null();
        writer.Key("count");
        writer.Int64(count);
        writer.EndObject();
    }
    writer.EndArray();
}

void WriteQuarterHours(Writer& writer, const store::QuarterHours& quarterHours) {
    writer.Key("quarterHours");
    writer.StartArray();
    for (const auto& [quarterHour, count] : quarterHours) {
        writer.StartArray();
        writer.Int64(quarterHour);
        writer.Int64(count);
        writer.EndArray();
    }
    writer.EndArray();
}

void WriteRefused(Writer& writer, const std::vector<RefusedAt>& refused) {
    writer.Key("refused");
    writer.StartArray();
    for (const auto& mark : refused) {
        writer.StartObject();
        writer.Key("at");
        writer.Int64(mark.atMs);
        for (const auto& [reason, count] : mark.byReason) {
            writer.Key(reason.c_str());
            writer.Uint64(count);
        }
        writer.EndObject();
    }
    writer.EndArray();
}

std::string JsonOf(const PageData& data) {
    rapidjson::StringBuffer text;
    Writer writer(text);
    writer.StartObject();
    writer.Key("generatedAt");
    writer.Int64(data.generatedAtMs);
    writer.Key("reloadSeconds");
    writer.Int(data.reloadSeconds);
    writer.Key("rowsBefore");
    writer.Int64(data.rowsBefore);
    writer.Key("status");
    writer.RawValue(data.statusJson.data(), data.statusJson.size(), rapidjson::kObjectType);
    WriteQuarterHours(writer, data.quarterHours);
    WriteCounts(writer, "events", data.events);
    WriteCounts(writer, "modules", data.modules);
    WriteRefused(writer, data.refused);
    writer.EndObject();
    return {text.GetString(), text.GetSize()};
}

/// The JSON for an HTML script element. No text in it may end the element or begin a comment. The characters
/// that could do so stand only in JSON strings, where they can be written as escapes.
std::string ForScriptElement(const std::string& json) {
    std::string safe;
    safe.reserve(json.size());
    for (const char c : json) {
        if (c == '<' || c == '>' || c == '&')
            safe += fmt::format("\\u{:04x}", static_cast<unsigned>(c));
        else
            safe += c;
    }
    return safe;
}

std::string_view PartOf(std::string_view name, const std::string& data, std::string_view nonce) {
    if (name == "NONCE")
        return nonce;
    if (name == "STYLE")
        return embedded::PageCss();
    if (name == "CHART")
        return embedded::ChartJs();
    return name == "SCRIPT" ? embedded::PageJs() : std::string_view(data);
}

} // namespace

std::string ComposePage(const PageData& data, const std::string& nonce) {
    const auto json = ForScriptElement(JsonOf(data));
    std::string page;
    // Replaces each @NAME@ of the template, from left to right. The text that is put in is not searched.
    for (std::string_view rest = embedded::PageHtml(); !rest.empty();) {
        const auto begin = rest.find('@');
        page += rest.substr(0, begin);
        if (begin == std::string_view::npos)
            break;
        const auto end = rest.find('@', begin + 1);
        page += PartOf(rest.substr(begin + 1, end - begin - 1), json, nonce);
        rest.remove_prefix(end + 1);
    }
    return page;
}

std::string RandomNonce() {
    std::random_device random;
    std::string nonce;
    for (int word = 0; word < 4; ++word)
        nonce += fmt::format("{:08x}", random());
    return nonce;
}

} // namespace reportctl::page
