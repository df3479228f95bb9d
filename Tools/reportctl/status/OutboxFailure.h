#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "Tools/reportctl/status/Status.h"

/// What the log says about the outbox, and whether a failure still lasts. Pure functions.
///
/// The life of a failure: told → lasts → ended by a line of the same cause that says so, or by a later event
/// that would have been impossible. The outbox tells each cause at most once a minute, and the process that
/// tells the end is the one that told the failure.
namespace reportctl::status {

/// The process whose lines count. Lines of earlier processes say nothing about this one: it begins anew.
struct LogWriter {
    std::string process;
    std::int64_t startedAtMs = 0; ///< 0 when it is not known.
};

/// Puts a line of the outbox in the place of an earlier one of the same cause. `lines` stays in the order of
/// the log.
void TakeOutboxLine(std::vector<Log::Line>& lines, Log::Line line);

/// Adds the failure of the upload that the outbox noted, unless the log has a later line about uploads. The
/// log may have lost the line: under load, its newest part is of some seconds only.
void AddNotedFailure(std::vector<Log::Line>& lines, const Outbox& outbox, const LogWriter& writer);

/// Events that end a failure. In milliseconds since 1970; 0 for never.
struct OutboxWorked {
    std::int64_t deliveredAtMs = 0; ///< The collector took events.
    std::int64_t storedAtMs = 0;    ///< The outbox took an event.
};

/// The newest failure that has not ended, as the outbox told it. A loss, which is over when it is told,
/// counts for ten minutes.
std::optional<std::string> LastingFailure(const std::vector<Log::Line>& lines, const OutboxWorked& worked,
                                          std::int64_t nowMs);

} // namespace reportctl::status
