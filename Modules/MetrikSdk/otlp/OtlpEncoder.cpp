#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"

#include <algorithm>
#include <array>
#include <map>
#include <optional>
#include <set>
#include <string_view>
#include <vector>

#include "Modules/MetrikSdk/Version.h"
#include "Modules/MetrikSdk/otlp/AnyValue.h"
#include "Modules/MetrikSdk/otlp/InstanceId.h"
#include "Modules/MetrikSdk/otlp/Payload.h"
#include "SystemTool/Text/Utf8.h"

namespace MetrikSdk::otlp {
namespace {

/// The schema that defines the names of the attributes below, as far as they are common names.
constexpr const char* SCHEMA_URL = "https://opentelemetry.io/schemas/1.30.0";

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
        Resource(outboxId, module);
        m_writer.Key("scopeLogs");
        m_writer.StartArray();
        m_writer.StartObject();
        Scope();
        m_writer.Key("logRecords");
        m_writer.StartArray();
        for (const auto* event : events)
            LogRecord(*event, module);
        m_writer.EndArray();
        TextMember("schemaUrl", SCHEMA_URL);
        m_writer.EndObject();
        m_writer.EndArray();
        TextMember("schemaUrl", SCHEMA_URL);
        m_writer.EndObject();
    }

    void Resource(const std::string& outboxId, const ModuleIdentity& module) {
        m_writer.Key("resource");
        m_writer.StartObject();
        m_writer.Key("attributes");
        m_writer.StartArray();
        OwnResource(outboxId, module);
        for (const auto& [name, value] : m_config.attributes)
            if (std::find(OWN_NAMES.begin(), OWN_NAMES.end(), name) == OWN_NAMES.end())
                TextAttribute(SystemTool::Text::ValidUtf8(name), value);
        m_writer.EndArray();
        m_writer.EndObject();
    }

    /// All names that OwnResource writes.
    static constexpr std::array<std::string_view, 7> OWN_NAMES{
        "service.name", "service.namespace", "service.version", "service.instance.id",
        "os.type",      "os.description",    "metrik.outbox.id"};

    void OwnResource(const std::string& outboxId, const ModuleIdentity& module) {
        const auto& moduleName = module.name.empty() ? module.id : module.name;
        TextAttribute("service.name", m_config.serviceName.empty() ? moduleName : m_config.serviceName);
        TextAttribute("service.namespace", "hublink");
        TextAttribute("service.version", module.version);
        TextAttribute("service.instance.id", InstanceId(outboxId, module.id));
        TextAttribute("os.type", m_config.osType);
        TextAttribute("os.description", m_config.osDescription);
        TextAttribute("metrik.outbox.id", outboxId);
    }

    void Scope() {
        m_writer.Key("scope");
        m_writer.StartObject();
        TextMember("name", "MetrikSdk");
        TextMember("version", SDK_VERSION);
        m_writer.EndObject();
    }

    void LogRecord(const StoredEvent& event, const ModuleIdentity& module) {
        const Payload payload(event.payload);
        m_writer.StartObject();
        TextMember("timeUnixNano", Nanoseconds(payload.CreateTime().value_or(event.storedAt)));
        TextMember("observedTimeUnixNano", Nanoseconds(event.storedAt));
        m_writer.Key("severityNumber");
        m_writer.Int(SEVERITY_INFO);
        TextMember("severityText", "INFO");
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
        TextAttribute("metrik.module", module.id);
        TextAttribute("metrik.event", event.eventId); // some collectors do not pass eventName on
        OptionalAttribute("user.id", payload.TextIn("eventData", "openid"));
        OptionalAttribute("hublink.version", payload.TextIn("extend", "hublinkVersion"));
        if (const auto* data = payload.EventData())
            DataAttributes(*data);
        m_writer.EndArray();
        m_writer.EndObject();
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
        TextMember("key", "metrik.data." + std::string(name));
        m_writer.Key("value");
        WriteAnyValue(m_writer, value);
        m_writer.EndObject();
    }

    /// The protocol's JSON writes 64-bit integers as texts, because many readers keep numbers as doubles.
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

    void TextAttribute(const std::string& key, const std::string& text) {
        Attribute(key, "stringValue", SystemTool::Text::ValidUtf8(text));
    }

    void Attribute(const std::string& key, const char* type, const std::string& value) {
        m_writer.StartObject();
        TextMember("key", key);
        m_writer.Key("value");
        m_writer.StartObject();
        TextMember(type, value);
        m_writer.EndObject();
        m_writer.EndObject();
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
