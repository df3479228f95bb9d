#pragma once

#include <functional>
#include <string>
#include <utility>
#include <vector>

namespace MetrikSdk::otlp {

/// What each request says about this machine and installation, beside what it says about a module.
struct ResourceConfig {
    std::string serviceName;   ///< For every module; empty: each has its own name.
    std::string osType;        ///< "linux", "darwin".
    std::string osDescription; ///< For people.
    /// What OTEL_RESOURCE_ATTRIBUTES adds. Our own attributes win over one with the same name, but for
    /// service.name.
    std::vector<std::pair<std::string, std::string>> attributes;
};

/// From OTEL_SERVICE_NAME, OTEL_RESOURCE_ATTRIBUTES and the system. A list that is ill-formed counts as unset
/// as a whole, as the variable's definition wants it, and is described in `complaints`. The machine's name is
/// not read: it is a person's machine. Who wants it sets host.name. `lookUp` returns the value of a variable,
/// or null.
ResourceConfig ReadResource(const std::function<const char*(const char*)>& lookUp,
                            std::vector<std::string>& complaints);

} // namespace MetrikSdk::otlp
