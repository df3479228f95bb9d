#pragma once

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <optional>

#include "Modules/OrvekSqlite/Settings.h"

namespace OrvekSqlite::group {

using Clock = std::chrono::steady_clock; ///< a step of the wall clock must not hold a commit up

/// The decisions about groups of statements, as functions of the time. See Group.h for what is done about
/// them.
class GroupPolicy {
public:
    explicit GroupPolicy(const GroupSettings& settings) : m_settings(settings) {}

    /// Whether a statement that comes now commits by itself. `last` is when the one before it was over; the
    /// first has none.
    bool IsAlone(std::optional<Clock::time_point> last, Clock::time_point now) const {
        return !last || now - *last >= m_settings.burstGap;
    }

    /// When a group that took the lock at `began` is to be committed at the latest.
    Clock::time_point Due(Clock::time_point began) const { return began + m_settings.span; }

    /// Whether a group has to be committed now.
    bool IsComplete(std::size_t statements, std::size_t bytes, Clock::time_point began,
                    Clock::time_point now) const {
        return statements >= m_settings.statements || bytes >= m_settings.bytes || now >= Due(began);
    }

    /// When a group that could not be committed is tried again.
    Clock::time_point NextTry(Clock::time_point lastTry) const { return lastTry + m_settings.retry; }

    /// Whether a statement that comes now may try it. The committer does not wait for another program's lock,
    /// so a statement does: it tries at once.
    bool MayTry(Clock::time_point lastTry, bool metALock, Clock::time_point now) const {
        return metALock || now >= NextTry(lastTry);
    }

    /// How long the lock is left free after a group that held it for `held`, when another process has the
    /// file open. SQLite has no queue for the lock: a program that waits for it looks after 1, 2, 5, 10, 15,
    /// 20, 25 and more milliseconds. It finds a lock that is free for half of the time within a few looks. It
    /// may never find one that is taken again at once.
    Clock::duration Pause(Clock::duration held) const {
        return std::min<Clock::duration>(held, m_settings.longestPause);
    }

private:
    GroupSettings m_settings;
};

} // namespace OrvekSqlite::group
