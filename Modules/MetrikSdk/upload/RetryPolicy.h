#pragma once

#include <chrono>
#include <string>
#include <vector>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/Time.h"
#include "Modules/MetrikSdk/otlp/EndpointConfig.h"
#include "Modules/MetrikSdk/otlp/HttpResult.h"

namespace MetrikSdk::upload {

/// What to do with the events of a request.
enum class Verdict {
    Delete,        ///< The collector has taken them.
    Wait,          ///< Keep them and try again later: the reason has nothing to do with them.
    WaitAndHalve,  ///< Try again later with half of them: they may be too long for the line.
    WaitThenHalve, ///< Try again later, and with half of them when that fails, too.
    Halve,         ///< At least one of them will never be taken.
    HalveForSize   ///< As Halve, and a request of this length will never be taken either.
};

/// What a 2xx answer says about the events of its request.
struct PartialSuccess {
    std::size_t rejected = 0; ///< At most as many as were sent.
    std::string message;
    /// The count as the collector wrote it, when it is no count or more than were sent.
    std::string impossible;
};

/// The decisions behind the table of answers in docs/Outbox.md. Pure.
namespace RetryPolicy {

Verdict Judge(const otlp::HttpResult& result);

PartialSuccess ReadPartialSuccess(const otlp::HttpResult& result, std::size_t sent);

/// How long to wait before the first request of a process. `random` is uniform in [0, 1).
std::chrono::milliseconds WaitAtStart(double random, const RetrySettings& settings);

/// How long to wait before the next attempt, after `failures` (at least 1) in a row. `random` is uniform in
/// [0, 1). The collector's wish counts up to its limit, and never shortens our own wait: a collector that
/// always answers "after 0 seconds" must not be asked in a loop.
std::chrono::milliseconds WaitBefore(const otlp::HttpResult& result, int failures, double random,
                                     WallTime now, const RetrySettings& settings);

/// How long the collector wishes us to wait, up to the bound, and a random time more: it tells all machines
/// the same, and they must not come back together. 0 when it says nothing. It may say so in any answer.
std::chrono::milliseconds WishedWait(const otlp::HttpResult& result, double random, WallTime now,
                                     const RetrySettings& settings);

/// One line about what went wrong, for people.
std::string Describe(const otlp::HttpResult& result);

/// What a person should look at when the answer points to a wrong configuration rather than to wrong events;
/// otherwise empty. `headers` are the names of the configured headers, because the credentials are in one of
/// them. `variables` are those that configured the sender.
std::string LookAt(const otlp::HttpResult& result, const std::vector<std::string>& headers,
                   const otlp::VariableNames& variables = {});

} // namespace RetryPolicy
} // namespace MetrikSdk::upload
