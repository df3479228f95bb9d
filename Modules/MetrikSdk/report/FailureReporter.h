#pragma once

#include <array>
#include <chrono>
#include <mutex>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Time.h"
#include "Modules/MetrikSdk/report/News.h"

namespace MetrikSdk::report {

/// Decides which failures are told: of the same cause at most one in an interval, with the number of those
/// that were kept back since. Its end is told once for each failure that was told, because a
/// person who reads of a failure wants to know whether it lasts. All outboxes of a process share one: they
/// end in the same log, and a full disk hits them all. The clock is the caller's. Threads: any.
class FailureReporter {
public:
    explicit FailureReporter(std::chrono::milliseconds interval) : m_interval(interval) {}

    /// Counts the failure. Returns the text to tell now, or nothing when its cause was told too recently.
    std::optional<std::string> RecordFailure(Cause cause, const std::string& text, SteadyTime now);

    /// Whether the end of failures of this cause is to be told.
    bool ReportEnd(Cause cause);

private:
    struct History {
        std::optional<SteadyTime> lastTold;
        bool endIsDue = false; ///< A failure was told, and no end after it.
        unsigned long keptBack = 0;
    };

    const std::chrono::milliseconds m_interval;
    std::mutex m_mutex; ///< Guards the histories.
    std::array<History, static_cast<std::size_t>(Cause::Count)> m_histories{};
};

} // namespace MetrikSdk::report
