#pragma once

#include <chrono>
#include <string>

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
    std::size_t rejected = 0;
    std::string message;
};

/// The decisions behind docs/Outbox.md's table of answers. Pure.
namespace RetryPolicy {

Verdict Judge(const otlp::HttpResult& result);

/// How many events a 2xx answer counts as rejected (at most `sent`), and what it says about it.
PartialSuccess ReadPartialSuccess(const otlp::HttpResult& result, std::size_t sent);

/// How long to wait before the next attempt, after `failures` (at least 1) in a row. `random` is uniform in
/// [0, 1). The collector's wish counts up to its bound, and never shortens our own wait: a collector that
/// answers "after 0 seconds" for ever must not be asked in a loop.
std::chrono::milliseconds WaitBefore(const otlp::HttpResult& result, int failures, double random,
                                     WallTime now, const RetrySettings& settings);

/// One line about what went wrong, for people.
std::string Describe(const otlp::HttpResult& result);

} // namespace RetryPolicy
} // namespace MetrikSdk::upload
