#pragma once

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <thread>

#include "Modules/OrvekSqlite/group/Group.h"

namespace OrvekSqlite::group {

/// The thread that commits a group when no further statement comes. It also tries again to commit a group
/// whose commit failed.
///
/// It starts with the first group. While the group is empty, it sleeps without a deadline; otherwise it
/// sleeps until the group is due. In a burst it wakes about a hundred times a second. A single statement does
/// not wake it.
///
/// It never waits for another process's lock. It holds the mutex, so the thread that runs statements would
/// have to wait with it.
///
/// Threads: see each operation.
class Committer {
public:
    /// `mutex` guards the group and the members of this class. The mutex and the group outlive the committer.
    Committer(std::mutex& mutex, Group& group) : m_mutex(mutex), m_group(group) {}

    /// Call Stop first.
    ~Committer() = default;

    /// Call this after each statement, with the mutex held: the group may be due at some time now.
    void Notice();

    /// Ends the thread and waits for it. Call this without the mutex, and not on the committer's thread.
    void Stop();

    /// Whether the caller is on the committer's thread. Any thread may call this, with or without the mutex.
    bool IsThisThread() const { return m_self == std::this_thread::get_id(); }

private:
    void Start();
    void Run();

    std::mutex& m_mutex;
    Group& m_group;
    std::condition_variable m_wake;
    std::thread m_thread;
    /// The id of the committer's thread. A thread-local variable would not do: the C library ends the process
    /// when it finds no memory for such a variable of a plug-in.
    std::atomic<std::thread::id> m_self;
    bool m_isResting = true; ///< the thread waits without a deadline, or is not started
    bool m_stop = false;
};

} // namespace OrvekSqlite::group
