#pragma once

#include <chrono>
#include <string>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/Time.h"
#include "Modules/MetrikSdk/otlp/HttpResult.h"

namespace MetrikSdk::upload {

/// What to do with the events of a request.
enum class Verdict {
    Delete, ///< The collector has taken them.
    Wait,   ///< Keep them and try again later.
    Halve   ///< At least one of them will never be taken.
};

/// The decisions behind docs/Outbox.md's table of answers. Pure.
namespace RetryPolicy {

Verdict Judge(const otlp::HttpResult& result);

/// How many events a 2xx answer counts as rejected (at most `sent`), and what it says about it.
struct PartialSuccess {
    std::size_t rejected = 0;
    std::string message;
};
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
