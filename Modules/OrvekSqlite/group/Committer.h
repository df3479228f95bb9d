#pragma once

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <thread>

#include "Modules/OrvekSqlite/group/Group.h"

namespace OrvekSqlite::group {

/// The thread that commits a group when no further statement comes, and tries an uncommitted group again.
///
/// It starts with the first group. It sleeps without a deadline while the group is empty, and otherwise until
/// the group is due. In a burst it wakes about a hundred times a second; a single statement does not wake it.
///
/// It never waits for another process's lock, because it holds the mutex: the thread that brings statements
/// would have to wait with it.
///
/// Threads: see each operation.
class Committer {
public:
    /// `mutex` guards the group and what is in here. Both outlive the committer.
    Committer(std::mutex& mutex, Group& group) : m_mutex(mutex), m_group(group) {}

    /// Stop must have been called.
    ~Committer() = default;

    /// The group may be due at some time now. To be called with the mutex held.
    void Notice();

    /// Ends the thread and waits for it; without the mutex, and not on the thread itself.
    void Stop();

    /// Whether the caller is the thread. Callable from any thread, with or without the mutex.
    bool IsThisThread() const { return m_self == std::this_thread::get_id(); }

private:
    void Start();
    void Run();

    std::mutex& m_mutex;
    Group& m_group;
    std::condition_variable m_wake;
    std::thread m_thread;
    /// No thread-local variable tells: the C library ends the process where it finds no memory for a
    /// plug-in's.
    std::atomic<std::thread::id> m_self;
    bool m_isResting = true; ///< waits without a deadline, or has not been started
    bool m_stop = false;
};

} // namespace OrvekSqlite::group
