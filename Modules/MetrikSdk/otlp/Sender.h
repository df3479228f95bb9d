#pragma once

#include <string>
#include <vector>

#include "Modules/MetrikSdk/otlp/HttpResult.h"

namespace MetrikSdk::otlp {

/// Takes a request's body to the collector. Post by one thread; Abandon by any, also before Post.
class Sender {
public:
    virtual ~Sender() = default;

    /// Blocks until there is an answer or a reason why there is none.
    virtual HttpResult Post(const std::string& body) = 0;

    /// Ends the request under way, and every later one at once.
    virtual void Abandon() = 0;

    /// Where to, for people.
    virtual std::string Destination() const = 0;

    /// The names of the headers that were configured, for people.
    virtual std::vector<std::string> HeaderNames() const = 0;
};

} // namespace MetrikSdk::otlp
