#include "Tools/reportctl/forward/Row.h"

#include <string_view>

#include "Common/Wire.h"
#include "Modules/MetrikSdk/otlp/InstanceId.h"
#include "SystemTool/IO/JsonParse.h"
#include "SystemTool/Text/Utf8.h"

namespace reportctl::forward {
namespace {

using SystemTool::IO::JsonTree;
using SystemTool::IO::JsonWriter;

/// A row's number and the like, beside its texts.
constexpr std::size_t BYTES_BESIDE_TEXTS = 100;

void WriteText(JsonWriter& writer, const char* key, const Row::Text& text) {
    if (!text)
        return;
    const auto utf8 = SystemTool::Text::ValidUtf8(*text);
    writer.Key(key);
    writer.String(utf8.data(), static_cast<rapidjson::SizeType>(utf8.size()));
}

/// The open id is the row's, as in an event for analytics, also when the program put one into the value.
void WriteMembers(JsonWriter& writer, const JsonTree& value) {
    for (const auto& member : value.GetObject()) {
        const std::string_view name(member.name.GetString(), member.name.GetStringLength());
        if (name == Wire::EVENT_OPEN_ID)
            continue;
        writer.Key(name.data(), static_cast<rapidjson::SizeType>(name.size()));
        member.value.Accept(writer); // calls itself for each level, of which ReadJson lets 128 pass
    }
}

void WriteValue(JsonWriter& writer, const Row::Text& value) {
    JsonTree tree;
    const bool isJson = value && SystemTool::IO::ReadJson(*value, tree).empty();
    if (isJson && tree.IsObject()) {
        WriteMembers(writer, tree);
    } else if (isJson && tree.IsArray()) {
        writer.Key(Wire::VALUE);
        tree.Accept(writer);
    } else {
        WriteText(writer, Wire::VALUE, value);
    }
}

std::string PayloadOf(const Row& row) {
    SystemTool::IO::JsonBuffer text;
    JsonWriter writer(text);
    writer.StartObject();
    writer.Key(Wire::EVENT_EXTEND);
    writer.StartObject();
    WriteText(writer, Wire::HUBLINK_VERSION, row.suiteVersion);
    WriteText(writer, Wire::CREATE_TIME, row.createTime);
    writer.EndObject();
    writer.Key(Wire::EVENT_DATA);
    writer.StartObject();
    WriteValue(writer, row.value);
    WriteText(writer, Wire::EVENT_OPEN_ID, row.openid);
    writer.EndObject();
    writer.EndObject();
    return {text.GetString(), text.GetSize()};
}

/// With its length, so that no two rows make one text.
void Append(std::string& name, const Row::Text& text) {
    name += text ? std::to_string(text->size()) + ':' + *text : "-";
    name += ',';
}

} // namespace

std::size_t BytesOf(const Row& row) {
    std::size_t bytes = BYTES_BESIDE_TEXTS;
    for (const auto* text : {&row.eventID, &row.value, &row.createTime, &row.suiteVersion, &row.openid})
        bytes += text->has_value() ? (*text)->size() : 0;
    return bytes;
}

std::string UidOf(const std::string& installation, const Row& row) {
    auto name = "store row " + std::to_string(row.id) + ',';
    for (const auto* text : {&row.eventID, &row.value, &row.createTime, &row.suiteVersion, &row.openid})
        Append(name, *text);
    return MetrikSdk::otlp::InstanceId(installation, name);
}

MetrikSdk::StoredEvent EventOf(const std::string& installation, const Row& row, MetrikSdk::WallTime now) {
    return {.row = row.id,
            .uuid = UidOf(installation, row),
            .release = 1,
            .eventId = row.eventID.value_or(""),
            .payload = PayloadOf(row),
            .storedAt = now,
            .bytes = BytesOf(row),
            .source = MetrikSdk::Source::Store};
}

} // namespace reportctl::forward
