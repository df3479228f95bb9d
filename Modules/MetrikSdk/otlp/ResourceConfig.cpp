#include "Modules/MetrikSdk/otlp/ResourceConfig.h"

#include <algorithm>
#include <optional>

#include <sys/utsname.h>

#include "Modules/MetrikSdk/otlp/VariableText.h"
#include "SystemTool/CommonTool.h"

namespace MetrikSdk::otlp {
namespace {

using Attributes = std::vector<std::pair<std::string, std::string>>;

/// Whether each '%' is followed by two hexadecimal digits.
bool IsPercentEncoded(const std::string& text) {
    static constexpr auto DIGITS = "0123456789abcdefABCDEF";
    for (auto at = text.find('%'); at != std::string::npos; at = text.find('%', at + 1))
        if (at + 2 >= text.size() || text.find_first_not_of(DIGITS, at + 1) < at + 3)
            return false;
    return true;
}

/// Nothing when the list has a wrong form.
std::optional<Attributes> Parsed(const std::string& list) {
    Attributes attributes;
    for (std::size_t start = 0; start < list.size();) {
        const auto end = std::min(list.find(',', start), list.size());
        const auto text = Trimmed(list.substr(start, end - start));
        start = end + 1;
        if (text.empty())
            continue;
        if (!IsPercentEncoded(text))
            return std::nullopt;
        const auto equals = text.find('=');
        const auto key = PercentDecoded(Trimmed(text.substr(0, equals)));
        if (equals == std::string::npos || key.empty())
            return std::nullopt;
        const auto value = PercentDecoded(Trimmed(text.substr(equals + 1)));
        const auto same = [&key](const auto& attribute) { return attribute.first == key; };
        if (std::none_of(attributes.begin(), attributes.end(), same))
            attributes.emplace_back(key, value);
    }
    return attributes;
}

/// Removes service.name from the list and returns its value, which is only a default there.
std::string TakeServiceName(Attributes& attributes) {
    const auto found = std::find_if(attributes.begin(), attributes.end(),
                                    [](const auto& attribute) { return attribute.first == "service.name"; });
    if (found == attributes.end())
        return {};
    auto name = std::move(found->second);
    attributes.erase(found);
    return name;
}

std::string OsType() {
    struct utsname system {};
    return ::uname(&system) == 0 ? LowerCase(system.sysname) : std::string();
}

} // namespace

ResourceConfig ReadResource(const std::function<const char*(const char*)>& lookUp,
                            std::vector<std::string>& complaints) {
    const auto read = [&](const char* name) {
        const char* value = lookUp(name);
        return value == nullptr ? std::string() : Trimmed(value);
    };
    ResourceConfig config;
    auto attributes = Parsed(read("OTEL_RESOURCE_ATTRIBUTES"));
    if (!attributes)
        complaints.emplace_back("OTEL_RESOURCE_ATTRIBUTES is no list of key=value and counts as unset");
    config.attributes = std::move(attributes).value_or(Attributes());
    const auto listed = TakeServiceName(config.attributes);
    config.serviceName = read("OTEL_SERVICE_NAME");
    if (config.serviceName.empty())
        config.serviceName = listed;
    config.osType = OsType();
    config.osDescription = SystemTool::CommonTool::GetOSVersionString();
    return config;
}

} // namespace MetrikSdk::otlp
