#pragma once

#include <functional>
#include <string>
#include <utility>
#include <vector>

namespace MetrikSdk::otlp {

/// What each request says about this machine and installation, besides what it says about a module.
struct ResourceConfig {
    std::string serviceName;   ///< The service name of every module; empty: each module's own name.
    std::string osType;        ///< "linux", "darwin".
    std::string osDescription; ///< The name and version of the system, for people.
    /// The attributes from OTEL_RESOURCE_ATTRIBUTES. When one has the name of an attribute of ours, ours is
    /// sent, except for service.name.
    std::vector<std::pair<std::string, std::string>> attributes;
};

/// Reads OTEL_SERVICE_NAME, OTEL_RESOURCE_ATTRIBUTES and the system. A list with a wrong form counts as unset
/// as a whole, as the variable's definition wants it, and is described in `complaints`. The machine's name is
/// not read, because it is a person's machine. To send it, set host.name in OTEL_RESOURCE_ATTRIBUTES.
/// `lookUp` returns the value of a variable, or null.
ResourceConfig ReadResource(const std::function<const char*(const char*)>& lookUp,
                            std::vector<std::string>& complaints);

} // namespace MetrikSdk::otlp
