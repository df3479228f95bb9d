#pragma once

#include <array>
#include <chrono>
#include <mutex>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Time.h"

namespace Metrik {

/// What went wrong, as coarse as somebody who reads the log wants it repeated.
enum class Cause {
    Configuration, ///< A variable of the environment that makes no sense.
    Directory,     ///< No directory to keep the outbox in.
    File,          ///< The outbox file cannot be used for now.
    Damage,        ///< The outbox file was set aside.
    Vanished,      ///< The outbox file was deleted or replaced.
    Event,         ///< An event that cannot be stored whatever the file's state.
    Drop,          ///< Events given up for a cap.
    Upload,        ///< The collector cannot be reached or asks to wait.
    Refusal,       ///< Events that the collector will never take.
    Init,          ///< A module could not be initialised for a reason that nobody foresaw.
    Count          ///< How many causes there are.
};

/// The first text of the failure callback.
const char* NameOf(Cause cause);

/// Decides which failures are told: of the same cause at most one in an interval, with the number of those
/// that were kept back since. Its end is told once for each that was told: whoever reads of a failure wants to
/// know whether it lasts. All outboxes of a process share one: they end in the same log, and a full disk
/// hits them all. The clock is the caller's. Threads: any.
class FailureReporter {
public:
    explicit FailureReporter(std::chrono::milliseconds interval) : m_interval(interval) {}

    /// The text to tell now, or nothing.
    std::optional<std::string> Report(Cause cause, const std::string& text, SteadyTime now);

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

} // namespace Metrik
