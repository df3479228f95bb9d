#pragma once

#include <string>
#include <vector>

#include "Modules/MetrikSdk/otlp/EndpointConfig.h"
#include "Modules/MetrikSdk/otlp/HttpResult.h"

namespace MetrikSdk::otlp {

/// Sends the body of a request to the collector. Threads: one calls Post. Any may call Abandon, also before
/// Post.
class Sender {
public:
    virtual ~Sender() = default;

    /// Blocks until there is an answer or a reason why there is none.
    virtual HttpResult Post(const std::string& body) = 0;

    /// Ends the request that is running, and every later one at once.
    virtual void Abandon() = 0;

    /// The address of the collector, for people.
    virtual std::string Destination() const = 0;

    /// The names of the configured headers, for people.
    virtual std::vector<std::string> HeaderNames() const = 0;

    /// The variables that configured this sender, for people.
    virtual VariableNames Variables() const { return {}; }
};

} // namespace MetrikSdk::otlp
