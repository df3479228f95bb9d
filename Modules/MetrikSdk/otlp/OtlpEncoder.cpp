#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"

#include <map>
#include <optional>
#include <set>
#include <string_view>
#include <vector>

#include "Modules/MetrikSdk/otlp/AnyValue.h"
#include "Modules/MetrikSdk/otlp/Parts.h"
#include "Modules/MetrikSdk/otlp/Payload.h"
#include "SystemTool/Text/Utf8.h"

namespace MetrikSdk::otlp {
namespace {

/// The severity of all events: an event is neither a warning nor an error.
constexpr int SEVERITY_INFO = 9;

class Encoder {
public:
    explicit Encoder(const ResourceConfig& config) : m_config(config) {}

    std::string operator()(const Batch& batch) {
        m_writer.StartObject();
        m_writer.Key("resourceLogs");
        m_writer.StartArray();
        for (const auto& [release, events] : ByRelease(batch))
            ResourceLogs(batch.outboxId, batch.releases.at(release), events);
        m_writer.EndArray();
        m_writer.EndObject();
        return {m_buffer.GetString(), m_buffer.GetSize()};
    }

private:
    using Events = std::vector<const StoredEvent*>;

    static std::map<std::int64_t, Events> ByRelease(const Batch& batch) {
        std::map<std::int64_t, Events> groups;
        for (const auto& event : batch.events)
            groups[event.release].push_back(&event);
        return groups;
    }

    void ResourceLogs(const std::string& outboxId, const ModuleIdentity& module, const Events& events) {
        m_writer.StartObject();
        m_writer.Key("resource");
        WriteResource(m_writer, m_config, outboxId, module);
        m_writer.Key("scopeLogs");
        m_writer.StartArray();
        m_writer.StartObject();
        m_writer.Key("scope");
        WriteScope(m_writer);
        m_writer.Key("logRecords");
        m_writer.StartArray();
        for (const auto* event : events)
            LogRecord(*event, module);
        m_writer.EndArray();
        WriteTextMember(m_writer, "schemaUrl", SCHEMA_URL);
        m_writer.EndObject();
        m_writer.EndArray();
        WriteTextMember(m_writer, "schemaUrl", SCHEMA_URL);
        m_writer.EndObject();
    }

    void LogRecord(const StoredEvent& event, const ModuleIdentity& module) {
        const Payload payload(event.payload);
        m_writer.StartObject();
        WriteTextMember(m_writer, "timeUnixNano", Nanoseconds(payload.CreateTime().value_or(event.storedAt)));
        WriteTextMember(m_writer, "observedTimeUnixNano", Nanoseconds(event.storedAt));
        m_writer.Key("severityNumber");
        m_writer.Int(SEVERITY_INFO);
        WriteTextMember(m_writer, "severityText", "INFO");
        WriteTextMember(m_writer, "eventName", SystemTool::Text::ValidUtf8(event.eventId));
        m_writer.Key("body");
        if (payload.Object() != nullptr)
            WriteAnyValue(m_writer, *payload.Object());
        else
            TextValue(event.payload);
        m_writer.Key("attributes");
        m_writer.StartArray();
        TextAttribute("log.record.uid", event.uuid);
        if (event.source == Source::Store)
            StoreRow(event);
        else
            OutboxEvent(event, module);
        TextAttribute("metrik.event", event.eventId); // some collectors do not pass eventName on
        OptionalAttribute("user.id", payload.TextIn("eventData", "openid"));
        OptionalAttribute("hublink.version", payload.TextIn("extend", "hublinkVersion"));
        if (const auto* data = payload.EventData())
            DataAttributes(*data);
        m_writer.EndArray();
        m_writer.EndObject();
    }

    void OutboxEvent(const StoredEvent& event, const ModuleIdentity& module) {
        IntegerAttribute("metrik.sequence", event.sequence);
        TextAttribute("metrik.module", module.id);
    }

    /// No module announced it, and nothing counts it: its id begins with the module's by habit alone.
    void StoreRow(const StoredEvent& event) {
        TextAttribute("hublink.source", "store");
        IntegerAttribute("hublink.row", event.row);
        if (const auto bar = event.eventId.find('|'); bar != std::string::npos)
            TextAttribute("metrik.module", event.eventId.substr(0, bar));
    }

    void OptionalAttribute(const char* key, const std::optional<std::string>& text) {
        if (text)
            TextAttribute(key, *text);
    }

    /// When several members have one name, the first one is written, as in the body.
    void DataAttributes(const JsonValue& data) {
        std::set<std::string_view> written;
        for (const auto& member : data.GetObject()) {
            const std::string_view name(member.name.GetString(), member.name.GetStringLength());
            const auto& value = member.value;
            const bool isScalar = value.IsString() || value.IsBool() || value.IsNumber();
            if (written.size() == MAX_DATA_ATTRIBUTES)
                return;
            if (isScalar && !name.empty() && name.size() <= MAX_DATA_NAME_BYTES &&
                written.insert(name).second)
                DataAttribute(name, value);
        }
    }

    void DataAttribute(std::string_view name, const JsonValue& value) {
        m_writer.StartObject();
        WriteTextMember(m_writer, "key", "metrik.data." + std::string(name));
        m_writer.Key("value");
        WriteAnyValue(m_writer, value);
        m_writer.EndObject();
    }

    void TextValue(const std::string& text) {
        m_writer.StartObject();
        WriteTextMember(m_writer, "stringValue", SystemTool::Text::ValidUtf8(text));
        m_writer.EndObject();
    }

    void TextAttribute(const std::string& key, const std::string& text) {
        WriteTextAttribute(m_writer, key, text);
    }

    void IntegerAttribute(const std::string& key, std::int64_t value) {
        WriteAttribute(m_writer, key, "intValue", std::to_string(value));
    }

    const ResourceConfig& m_config;
    SystemTool::IO::JsonBuffer m_buffer;
    JsonWriter m_writer{m_buffer};
};

} // namespace

std::string EncodeOtlp(const Batch& batch, const ResourceConfig& config) {
    return Encoder(config)(batch);
}

} // namespace MetrikSdk::otlp
