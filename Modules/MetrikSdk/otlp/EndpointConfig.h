#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace MetrikSdk::otlp {

/// The variables that decide, so that people can be told which one to look at. Of each pair, it is the one
/// that is used, or the common one when none is set.
struct VariableNames {
    std::string endpoint = "OTEL_EXPORTER_OTLP_ENDPOINT";
    std::string headers = "OTEL_EXPORTER_OTLP_HEADERS";
    std::string compression = "OTEL_EXPORTER_OTLP_COMPRESSION";
};

/// Where and how events are sent, as the OTEL_* variables of the environment say.
struct EndpointConfig {
    std::string url;
    std::vector<std::pair<std::string, std::string>> headers;
    /// For a whole request, with connecting. It is the documented default of the variables.
    std::chrono::milliseconds timeout = std::chrono::seconds(10);
    /// Events are much alike, so they become far smaller. Collectors can unpack them.
    bool gzip = true;
    std::string certificate; ///< PEM file to trust instead of the system's certificates; empty: the system's.
    std::string clientKey;   ///< PEM files to identify ourselves with; empty: not at all.
    std::string clientCertificate;
    VariableNames variables;
};

/// What is sent. Each has variables of its own, which win over the common ones, and a path of its own.
enum class Signal { Logs, Metrics };

/// What the environment asks for. Nothing when nothing is to be sent: no endpoint is set, OTEL_SDK_DISABLED
/// is true, or OTEL_LOGS_EXPORTER, for metrics OTEL_METRICS_EXPORTER, is none.
///
/// A variable that makes no sense is described in `complaints` and counts as unset, so that the common
/// variable of its pair is used. Of a list of headers, only the wrong header is left out. A variable that is
/// set and has no effect is described, too. `lookUp` returns the value of a variable, or null; an empty value
/// counts as unset.
using LookUp = std::function<const char*(const char*)>;
std::optional<EndpointConfig> ReadEndpoint(const LookUp& lookUp, std::vector<std::string>& complaints,
                                           Signal signal = Signal::Logs);

/// What switches sending off, such as "OTEL_SDK_DISABLED=true"; empty when nothing does.
std::string DisabledBy(const LookUp& lookUp, Signal signal = Signal::Logs);

/// The URL as people may see it: without user, password, query and fragment, which may be secrets.
std::string WithoutSecrets(const std::string& url);

} // namespace MetrikSdk::otlp
