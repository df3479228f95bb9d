#pragma once

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <optional>

#include "Modules/OrvekSqlite/Settings.h"

namespace OrvekSqlite::group {

using Clock = std::chrono::steady_clock; ///< a step of the wall clock must not delay a commit

/// The decisions about groups of statements, as functions of the time. Group acts on them.
class GroupPolicy {
public:
    explicit GroupPolicy(const GroupSettings& settings) : m_settings(settings) {}

    /// Whether a statement that comes now commits by itself. `last` is when the statement before it ended;
    /// the first statement has none.
    bool IsAlone(std::optional<Clock::time_point> last, Clock::time_point now) const {
        return !last || now - *last >= m_settings.burstGap;
    }

    /// The latest time to commit a group that took the lock at `began`.
    Clock::time_point Due(Clock::time_point began) const { return began + m_settings.span; }

    /// Whether a group has to be committed now.
    bool IsComplete(std::size_t statements, std::size_t bytes, Clock::time_point began,
                    Clock::time_point now) const {
        return statements >= m_settings.statements || bytes >= m_settings.bytes || now >= Due(began);
    }

    /// When to try again to commit a group whose commit failed.
    Clock::time_point NextTry(Clock::time_point lastTry) const { return lastTry + m_settings.retry; }

    /// Whether a statement that comes now may try to commit the group. After a failure because of another
    /// program's lock, it may try at once: the committer does not wait for the lock, so a statement has to.
    bool MayTry(Clock::time_point lastTry, bool metALock, Clock::time_point now) const {
        return metALock || now >= NextTry(lastTry);
    }

    /// How long the lock is left free after a group that held it for `held`, when another process has the
    /// file open. SQLite has no queue for the lock: a program that waits for it tries again after 1, 2, 5,
    /// 10, 15, 20, 25 and more milliseconds. When the lock is free for half of the time, the program gets it
    /// within a few tries. When the lock is always taken again at once, the program may never get it.
    Clock::duration Pause(Clock::duration held) const {
        return std::min<Clock::duration>(held, m_settings.longestPause);
    }

private:
    GroupSettings m_settings;
};

} // namespace OrvekSqlite::group
