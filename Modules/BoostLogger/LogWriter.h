#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>
#include <limits>
#include <mutex>
#include <string_view>

#include "Modules/BoostLogger/Flusher.h"
#include "Modules/BoostLogger/LiveFile.h"
#include "Modules/BoostLogger/LogSettings.h"
#include "Modules/BoostLogger/RotatedFiles.h"
#include "Modules/BoostLogger/WaitingLines.h"

namespace BoostLogger {

/// Writes lines into the log's files. It rotates the files, keeps all of them within the cap, and goes on
/// when the disk fails:
///
///   writing → (a step fails) → losing: lines are counted and dropped, at most four attempts a second
///           → (an attempt succeeds) → a record says how many were lost and why → writing
///
/// In a burst, lines share a write: see WaitingLines and Flusher.
///
/// Threads: all from any. Append blocks for no longer than the file system does, and 20 ms where another
/// process rotates at the same moment.
class LogWriter {
public:
    using TimePoint = std::chrono::steady_clock::time_point;

    explicit LogWriter(const LogSettings& settings);

    /// Makes the directory, opens the live file, and deletes rotated files that are over the cap, for example
    /// because the cap was larger before. After a failure Append may be called all the same: it opens the
    /// file as soon as that works.
    FileFailure Start();

    enum class Haste { MayWait, AtOnce };

    /// Appends one line, its newline included. When this returns the line is in the file and survives the end
    /// of this process, with all lines before it, or it is counted as lost. One that may wait is there a
    /// millisecond later at most if it comes in a burst.
    void Append(std::string_view line, TimePoint now, Haste haste = Haste::AtOnce) noexcept;

    /// The process ends: writes the lines that wait, and lets none wait from now on. Gives up when another
    /// thread keeps the lock for a fifth of a second.
    void Finish() noexcept;

    /// Counts a record that was lost before it became a line.
    void CountLost(std::uint64_t records = 1) noexcept {
        m_lost.fetch_add(records, std::memory_order_relaxed);
    }

private:
    static constexpr std::int64_t NO_LIMIT = std::numeric_limits<std::int64_t>::max();

    static std::int64_t FileSizeLimit();
    bool LetWait(std::string_view line, TimePoint now);
    void WriteWaiting(TimePoint now) noexcept;
    void Write(std::string_view lines, TimePoint now) noexcept;
    FileFailure Deliver(std::string_view& lines, TimePoint now);
    FileFailure FollowPath(TimePoint now);
    FileFailure Reopen();
    FileFailure ReportLoss();
    FileFailure Put(std::string_view& lines);
    std::string_view Fitting(std::string_view lines);
    FileFailure Rotate();
    void Prune();

    const LogSettings m_settings;
    const std::string m_path;
    std::atomic<std::uint64_t> m_lost = 0;

    std::mutex m_mutex; ///< Guards everything below, and the order of lines in the file.
    LiveFile m_live;
    RotatedFiles m_rotated;
    std::int64_t m_systemLimit = NO_LIMIT; ///< The limit when the live file was opened; see FileSizeLimit.
    TimePoint m_nextLook;                  ///< When to check next whether the path still leads to our file.
    TimePoint m_nextAttempt; ///< When to try again after a failure; lines that come before are dropped.
    FileFailure m_failure;   ///< The last failure. The record that reports the loss names it.
    bool m_losing = false;
    bool m_mayWait = true; ///< Until the process ends.
    unsigned m_forks = 0;  ///< See Forks, when a line waited last.
    WaitingLines m_waiting;
    Flusher m_flusher{m_mutex, m_waiting, [this] { WriteWaiting(std::chrono::steady_clock::now()); }};
};

} // namespace BoostLogger
