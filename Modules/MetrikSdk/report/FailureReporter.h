#pragma once

#include <array>
#include <chrono>
#include <mutex>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Time.h"
#include "Modules/MetrikSdk/report/News.h"

namespace MetrikSdk::report {

/// Decides which failures are reported: at most one of each cause in an interval, with the number of those
/// that were kept back since the last report. The end of the failures is reported once, if a failure was
/// reported before: a person who reads of a failure wants to know whether it lasted. All outboxes of a
/// process share one reporter, because their reports end in the same log, and a full disk affects all of
/// them. The caller passes the time. Threads: any.
class FailureReporter {
public:
    explicit FailureReporter(std::chrono::milliseconds interval) : m_interval(interval) {}

    /// Counts the failure. Returns the text to report now, or nothing when its cause was reported too
    /// recently.
    std::optional<std::string> RecordFailure(Cause cause, const std::string& text, SteadyTime now);

    /// Whether to report now that the failures of this cause have ended.
    bool ReportEnd(Cause cause);

private:
    struct History {
        std::optional<SteadyTime> lastTold;
        bool endIsDue = false; ///< A failure was reported, but not its end.
        unsigned long keptBack = 0;
    };

    const std::chrono::milliseconds m_interval;
    std::mutex m_mutex; ///< Guards the histories.
    std::array<History, static_cast<std::size_t>(Cause::Count)> m_histories{};
};

} // namespace MetrikSdk::report
