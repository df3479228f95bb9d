#include "Modules/MetrikSdk/otlp/Parts.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <string_view>

#include "Modules/MetrikSdk/Version.h"
#include "Modules/MetrikSdk/otlp/InstanceId.h"
#include "SystemTool/Text/Utf8.h"

namespace MetrikSdk::otlp {
namespace {

using SystemTool::IO::JsonWriter;

/// All names of WriteOwnResource.
constexpr std::array<std::string_view, 7> OWN_NAMES{
    "service.name", "service.namespace", "service.version", "service.instance.id",
    "os.type",      "os.description",    "metrik.outbox.id"};

void WriteOwnResource(JsonWriter& writer, const ResourceConfig& config, const std::string& outboxId,
                      const ModuleIdentity& module) {
    const auto& moduleName = module.name.empty() ? module.id : module.name;
    WriteTextAttribute(writer, "service.name", config.serviceName.empty() ? moduleName : config.serviceName);
    WriteTextAttribute(writer, "service.namespace", "hublink");
    WriteTextAttribute(writer, "service.version", module.version);
    WriteTextAttribute(writer, "service.instance.id", InstanceId(outboxId, module.id));
    WriteTextAttribute(writer, "os.type", config.osType);
    WriteTextAttribute(writer, "os.description", config.osDescription);
    WriteTextAttribute(writer, "metrik.outbox.id", outboxId);
}

} // namespace

void WriteTextMember(JsonWriter& writer, const char* name, const std::string& text) {
    writer.Key(name);
    writer.String(text.data(), static_cast<rapidjson::SizeType>(text.size()));
}

void WriteAttribute(JsonWriter& writer, const std::string& key, const char* type, const std::string& value) {
    writer.StartObject();
    WriteTextMember(writer, "key", key);
    writer.Key("value");
    writer.StartObject();
    WriteTextMember(writer, type, value);
    writer.EndObject();
    writer.EndObject();
}

void WriteTextAttribute(JsonWriter& writer, const std::string& key, const std::string& text) {
    WriteAttribute(writer, key, "stringValue", SystemTool::Text::ValidUtf8(text));
}

void WriteResource(JsonWriter& writer, const ResourceConfig& config, const std::string& outboxId,
                   const ModuleIdentity& module) {
    writer.StartObject();
    writer.Key("attributes");
    writer.StartArray();
    WriteOwnResource(writer, config, outboxId, module);
    for (const auto& [name, value] : config.attributes)
        if (std::find(OWN_NAMES.begin(), OWN_NAMES.end(), name) == OWN_NAMES.end())
            WriteTextAttribute(writer, SystemTool::Text::ValidUtf8(name), value);
    writer.EndArray();
    writer.EndObject();
}

void WriteScope(JsonWriter& writer) {
    writer.StartObject();
    WriteTextMember(writer, "name", "MetrikSdk");
    WriteTextMember(writer, "version", SDK_VERSION);
    writer.EndObject();
}

std::string Nanoseconds(WallTime time) {
    const std::chrono::nanoseconds nanoseconds = Computable(time).time_since_epoch();
    return std::to_string(nanoseconds.count());
}

} // namespace MetrikSdk::otlp
