#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"

#include <map>
#include <vector>

#include "Modules/MetrikSdk/Version.h"
#include "Modules/MetrikSdk/otlp/AnyValue.h"
#include "Modules/MetrikSdk/otlp/Payload.h"
#include "SystemTool/Text/Utf8.h"

namespace MetrikSdk::otlp {
namespace {

class Encoder {
public:
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
        Resource(outboxId, module);
        m_writer.Key("scopeLogs");
        m_writer.StartArray();
        m_writer.StartObject();
        Scope();
        m_writer.Key("logRecords");
        m_writer.StartArray();
        for (const auto* event : events)
            LogRecord(*event);
        m_writer.EndArray();
        m_writer.EndObject();
        m_writer.EndArray();
        m_writer.EndObject();
    }

    void Resource(const std::string& outboxId, const ModuleIdentity& module) {
        m_writer.Key("resource");
        m_writer.StartObject();
        m_writer.Key("attributes");
        m_writer.StartArray();
        TextAttribute("service.name", module.name.empty() ? module.id : module.name);
        TextAttribute("service.version", module.version);
        TextAttribute("service.instance.id", module.id);
        TextAttribute("metrik.outbox.id", outboxId);
        m_writer.EndArray();
        m_writer.EndObject();
    }

    void Scope() {
        m_writer.Key("scope");
        m_writer.StartObject();
        TextMember("name", "MetrikSdk");
        TextMember("version", SDK_VERSION);
        m_writer.EndObject();
    }

    void LogRecord(const StoredEvent& event) {
        const Payload payload(event.payload);
        m_writer.StartObject();
        TextMember("timeUnixNano", Nanoseconds(payload.CreateTime().value_or(event.storedAt)));
        TextMember("observedTimeUnixNano", Nanoseconds(event.storedAt));
        TextMember("eventName", SystemTool::Text::ValidUtf8(event.eventId));
        m_writer.Key("body");
        if (payload.Object() != nullptr)
            WriteAnyValue(m_writer, *payload.Object());
        else
            TextValue(event.payload);
        m_writer.Key("attributes");
        m_writer.StartArray();
        TextAttribute("log.record.uid", event.uuid);
        Attribute("metrik.sequence", "intValue", std::to_string(event.sequence));
        m_writer.EndArray();
        m_writer.EndObject();
    }

    /// The protocol's JSON writes 64-bit integers as texts, because many readers' numbers are doubles.
    static std::string Nanoseconds(WallTime time) {
        const std::chrono::nanoseconds nanoseconds = Computable(time).time_since_epoch();
        return std::to_string(nanoseconds.count());
    }

    void TextMember(const char* name, const std::string& text) {
        m_writer.Key(name);
        m_writer.String(text.data(), static_cast<rapidjson::SizeType>(text.size()));
    }

    void TextValue(const std::string& text) {
        m_writer.StartObject();
        TextMember("stringValue", SystemTool::Text::ValidUtf8(text));
        m_writer.EndObject();
    }

    void TextAttribute(const char* key, const std::string& text) {
        Attribute(key, "stringValue", SystemTool::Text::ValidUtf8(text));
    }

    void Attribute(const char* key, const char* type, const std::string& value) {
        m_writer.StartObject();
        TextMember("key", key);
        m_writer.Key("value");
        m_writer.StartObject();
        TextMember(type, value);
        m_writer.EndObject();
        m_writer.EndObject();
    }

    SystemTool::IO::JsonBuffer m_buffer;
    JsonWriter m_writer{m_buffer};
};

} // namespace

std::string EncodeOtlp(const Batch& batch) {
    return Encoder()(batch);
}

} // namespace MetrikSdk::otlp
