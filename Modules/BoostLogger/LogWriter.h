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
/// Threads: any may call Append, Finish and CountLost. Append blocks for as long as the file system does, and
/// for up to 20 ms when another process rotates at the same moment.
class LogWriter {
public:
    using TimePoint = std::chrono::steady_clock::time_point;

    explicit LogWriter(const LogSettings& settings);

    /// Makes the directory, opens the live file, and deletes rotated files that are over the cap, for example
    /// because the cap was larger before. After a failure Append may be called all the same: it opens the
    /// file as soon as that works.
    FileFailure Start();

    /// Whether a line may wait for the other lines of its burst.
    enum class Haste { MayWait, AtOnce };

    /// Appends one line, its newline included. When this returns, the line and all lines before it are in the
    /// file and survive the end of this process, or are counted as lost. The exception is a line of a burst
    /// that may wait: it is written a millisecond later at most, if the Flusher's thread gets a processor.
    void Append(std::string_view line, TimePoint now, Haste haste = Haste::AtOnce) noexcept;

    /// Call this when the process ends. Writes the waiting lines; later lines do not wait any more. Waits up
    /// to 200 ms for another thread that holds the lock, and then returns without a write.
    void Finish() noexcept;

    /// Counts a record that was lost before it became a line.
    void CountLost(std::uint64_t records = 1) noexcept {
        m_lost.fetch_add(records, std::memory_order_relaxed);
    }

private:
    static constexpr std::int64_t NO_LIMIT = std::numeric_limits<std::int64_t>::max();

    static std::int64_t FileSizeLimit();
    bool IsForked() const;
    std::unique_lock<std::mutex> Lock();
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
    const unsigned m_forks; ///< g_forks when this object was made. In a forked child, g_forks is higher.
    std::atomic<std::uint64_t> m_lost = 0;

    std::mutex m_mutex; ///< Guards everything below, and the order of lines in the file.
    LiveFile m_live;
    RotatedFiles m_rotated;
    std::int64_t m_systemLimit = NO_LIMIT; ///< The limit when the live file was opened; see FileSizeLimit.
    TimePoint m_nextLook;                  ///< When to check next whether the path still leads to our file.
    TimePoint m_nextAttempt; ///< When to try again after a failure; lines that come before are dropped.
    FileFailure m_failure;   ///< The last failure. The record that reports the loss names it.
    bool m_losing = false;
    bool m_mayWait = true; ///< False from Finish on, and in a forked child.
    WaitingLines m_waiting;
    Flusher m_flusher{m_mutex, m_waiting, [this] { WriteWaiting(std::chrono::steady_clock::now()); }};
};

} // namespace BoostLogger
