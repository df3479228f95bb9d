#pragma once

#include <chrono>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/Time.h"

namespace Metrik {

/// What came back for one request.
struct HttpResult {
    std::string fault;      ///< Why there was no complete answer; empty when there was one.
    bool abandoned = false; ///< We ended the request ourselves, because we are to stop.
    long status = 0;
    std::string contentType;
    std::string retryAfter; ///< The header as it came.
    std::string body;       ///< The first part of it: see HttpSender.
};

/// What to do with the events of a request.
enum class Verdict {
    Delete, ///< The collector has taken them.
    Wait,   ///< Keep them and try again later.
    Halve   ///< At least one of them will never be taken.
};

/// The decisions behind docs/Outbox.md's table of answers. Pure.
namespace RetryPolicy {

Verdict Judge(const HttpResult& result);

/// How many events a 2xx answer counts as rejected (at most `sent`), and what it says about it.
struct PartialSuccess {
    std::size_t rejected = 0;
    std::string message;
};
PartialSuccess ReadPartialSuccess(const HttpResult& result, std::size_t sent);

/// A Retry-After header: seconds, or a date. Nothing when it is neither.
std::optional<std::chrono::milliseconds> ParseRetryAfter(const std::string& header, WallTime now);

/// How long to wait before the next attempt, after `failures` (at least 1) in a row. `random` is uniform in
/// [0, 1). The collector's wish counts up to its bound, and never shortens our own wait: a collector that
/// answers "after 0 seconds" for ever must not be asked in a loop.
std::chrono::milliseconds WaitBefore(const HttpResult& result, int failures, double random, WallTime now,
                                     const RetrySettings& settings);

/// One line about what went wrong, for people.
std::string Describe(const HttpResult& result);

} // namespace RetryPolicy
} // namespace Metrik
