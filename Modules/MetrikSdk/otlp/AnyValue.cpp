#include "Modules/MetrikSdk/otlp/AnyValue.h"

#include <set>
#include <string>
#include <string_view>

namespace MetrikSdk::otlp {
namespace {

std::string_view TextOf(const JsonValue& value) {
    return {value.GetString(), value.GetStringLength()};
}

void WriteText(JsonWriter& writer, std::string_view text) {
    writer.String(text.data(), static_cast<rapidjson::SizeType>(text.size()));
}

void WriteMembers(JsonWriter& writer, const JsonValue& object) {
    std::set<std::string_view> written;
    for (const auto& member : object.GetObject()) {
        const auto key = TextOf(member.name);
        if (!written.insert(key).second)
            continue;
        writer.StartObject();
        writer.Key("key");
        WriteText(writer, key);
        writer.Key("value");
        WriteAnyValue(writer, member.value);
        writer.EndObject();
    }
}

void WriteElements(JsonWriter& writer, const JsonValue& array) {
    for (const auto& element : array.GetArray())
        WriteAnyValue(writer, element);
}

/// Both kinds of lists of the protocol have the same form: {"<type>": {"values": [...]}}.
void WriteList(JsonWriter& writer, const JsonValue& value) {
    writer.Key(value.IsObject() ? "kvlistValue" : "arrayValue");
    writer.StartObject();
    writer.Key("values");
    writer.StartArray();
    if (value.IsObject())
        WriteMembers(writer, value);
    else
        WriteElements(writer, value);
    writer.EndArray();
    writer.EndObject();
}

void WriteScalar(JsonWriter& writer, const JsonValue& value) {
    if (value.IsString()) {
        writer.Key("stringValue");
        WriteText(writer, TextOf(value));
    } else if (value.IsBool()) {
        writer.Key("boolValue");
        writer.Bool(value.GetBool());
    } else if (value.IsInt64()) {
        writer.Key("intValue");
        WriteText(writer, std::to_string(value.GetInt64()));
    } else if (value.IsUint64()) { // as a double it would lose its last digits
        writer.Key("stringValue");
        WriteText(writer, std::to_string(value.GetUint64()));
    } else if (value.IsNumber()) {
        writer.Key("doubleValue");
        writer.Double(value.GetDouble());
    } // null becomes an AnyValue without a value
}

} // namespace

void WriteAnyValue(JsonWriter& writer, const JsonValue& value) {
    writer.StartObject();
    if (value.IsObject() || value.IsArray())
        WriteList(writer, value);
    else
        WriteScalar(writer, value);
    writer.EndObject();
}

} // namespace MetrikSdk::otlp
