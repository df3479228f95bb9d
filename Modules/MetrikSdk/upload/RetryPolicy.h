#pragma once

#include <chrono>
#include <string>
#include <vector>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/Time.h"
#include "Modules/MetrikSdk/otlp/HttpResult.h"

namespace MetrikSdk::upload {

/// What to do with the events of a request.
enum class Verdict {
    Delete,        ///< The collector has taken them.
    Wait,          ///< Keep them and try again later: they have nothing to do with it.
    WaitAndHalve,  ///< Try again later with half of them: they may be too much for the line.
    WaitThenHalve, ///< Try again later, and with half of them when that is of no use.
    Halve,         ///< At least one of them will never be taken.
    HalveForSize   ///< The same, and a request of this length neither.
};

/// What a 2xx answer says about the events of its request.
struct PartialSuccess {
    std::size_t rejected = 0; ///< At most as many as were sent.
    std::string message;
    std::string impossible; ///< The count as it was written, when it is none or more than were sent.
};

/// The decisions behind docs/Outbox.md's table of answers. Pure.
namespace RetryPolicy {

Verdict Judge(const otlp::HttpResult& result);

PartialSuccess ReadPartialSuccess(const otlp::HttpResult& result, std::size_t sent);

/// How long to wait before the next attempt, after `failures` (at least 1) in a row. `random` is uniform in
/// [0, 1). The collector's wish counts up to its bound, and never shortens our own wait: a collector that
/// answers "after 0 seconds" for ever must not be asked in a loop.
std::chrono::milliseconds WaitBefore(const otlp::HttpResult& result, int failures, double random,
                                     WallTime now, const RetrySettings& settings);

/// How long the collector wishes us to wait, up to the bound; 0 when it says nothing. It may say so in any
/// answer.
std::chrono::milliseconds WishedWait(const otlp::HttpResult& result, WallTime now,
                                     const RetrySettings& settings);

/// One line about what went wrong, for people.
std::string Describe(const otlp::HttpResult& result);

/// What a person should look at, when the answer is one to a wrong configuration rather than to wrong events;
/// else empty. `headers` are the names of the headers that were configured: among them are the credentials.
std::string LookAt(const otlp::HttpResult& result, const std::vector<std::string>& headers);

} // namespace RetryPolicy
} // namespace MetrikSdk::upload
