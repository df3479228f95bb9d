#pragma once

#include <condition_variable>
#include <mutex>
#include <thread>

#include "Modules/OrvekSqlite/file/LiveFile.h"
#include "Modules/OrvekSqlite/group/Group.h"

namespace OrvekSqlite::group {

/// The thread that commits a group when nothing follows, and tries an uncommitted one again.
///
/// It starts with the first group. It sleeps without a deadline while nothing is kept, and in a burst until
/// a group's deadline: it wakes some hundred times a second, and a statement costs it nothing.
///
/// It never waits for another process's lock: the thread that brings statements would have to wait with it.
///
/// Threads: see each operation.
class Committer {
public:
    /// `mutex` guards the group, the file and what is in here. All three outlive the committer.
    Committer(std::mutex& mutex, Group& group, file::LiveFile& file)
        : m_mutex(mutex), m_group(group), m_file(file) {}

    /// Stop must have been called.
    ~Committer() = default;

    /// Something may be kept now. To be called with the mutex held.
    void Notice();

    /// Ends the thread and waits for it; without the mutex, and not on the thread itself.
    void Stop();

    /// Whether the caller is the thread. Callable from any thread, with or without the mutex.
    bool IsThisThread() const { return s_self == this; }

private:
    void Start();
    void Run();
    void CommitNow();

    static thread_local const Committer* s_self;

    std::mutex& m_mutex;
    Group& m_group;
    file::LiveFile& m_file;
    std::condition_variable m_wake;
    std::thread m_thread;
    bool m_isResting = true; ///< waits without a deadline, or has not been started
    bool m_stop = false;
};

} // namespace OrvekSqlite::group
