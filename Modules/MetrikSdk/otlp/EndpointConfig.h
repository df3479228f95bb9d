#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace MetrikSdk::otlp {

/// Where events go, and how, as the OTEL_* variables of the environment say.
struct EndpointConfig {
    std::string url;
    std::vector<std::pair<std::string, std::string>> headers;
    /// For a whole request, connecting included. The variables' documented default.
    std::chrono::milliseconds timeout = std::chrono::seconds(10);
    /// Events are much alike, and shrink a lot. Collectors unpack.
    bool gzip = true;
    std::string certificate; ///< PEM file to trust instead of the system's certificates; empty: the system's.
    std::string clientKey;   ///< PEM files to identify ourselves with; empty: not at all.
    std::string clientCertificate;
};

/// What the environment asks for; nothing when events are to stay in the outbox: no endpoint is set,
/// OTEL_SDK_DISABLED is true, or OTEL_LOGS_EXPORTER is none. What is set and has no effect is described, too.
/// A variable that makes no sense is described in `complaints` and counts as unset, so that the common one of
/// its pair holds; of a list of headers only the one that makes no sense is left out. `lookUp` returns the
/// value of a variable, or null; empty counts as unset.
using LookUp = std::function<const char*(const char*)>;
std::optional<EndpointConfig> ReadEndpoint(const LookUp& lookUp, std::vector<std::string>& complaints);

/// The URL as people may see it: without user, password, query and fragment, which may be secrets.
std::string WithoutSecrets(const std::string& url);

} // namespace MetrikSdk::otlp
