#pragma once

#include <optional>
#include <string>
#include <vector>

#include "Modules/MetrikSdk/otlp/EndpointConfig.h"
#include "Modules/MetrikSdk/otlp/ResourceConfig.h"
#include "Tools/reportctl/service/Environment.h"

namespace reportctl::forward {

/// Where everything goes, as the OTEL_* variables say.
struct Collector {
    std::optional<MetrikSdk::otlp::EndpointConfig> logs;
    std::optional<MetrikSdk::otlp::EndpointConfig> metrics;
    std::string disabledBy; ///< What switches the sending of rows off; empty: nothing.
    MetrikSdk::otlp::ResourceConfig resource;
    std::vector<std::string> complaints; ///< About variables that make no sense; each once.
};

/// This program's own environment where it names an endpoint, else that of the running service: what is typed
/// at a terminal goes where the service sends.
service::Environment EnvironmentToUse();

/// Reads what the environment asks for.
Collector CollectorOf(const service::Environment& environment);

} // namespace reportctl::forward
