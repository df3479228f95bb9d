#pragma once

#include <condition_variable>
#include <functional>
#include <mutex>
#include <optional>
#include <thread>

#include "Modules/BoostLogger/WaitingLines.h"

namespace BoostLogger {

/// Owns the thread that writes waiting lines when no further record comes. Without this thread, the last
/// lines of a burst would wait until the next record.
///
/// While no line waits, the thread sleeps without a deadline. While lines wait, it sleeps until they are due.
/// So it wakes about a thousand times a second in a burst, and a record that comes alone does not wake it.
///
/// Threads: any thread may call Notice. One thread makes, starts and destroys the object.
class Flusher {
public:
    /// `mutex` guards `lines` and the members of this object. `mutex` and `lines` must outlive this object.
    /// `write` writes the waiting lines. The thread calls it with the mutex held; it must not throw.
    Flusher(std::mutex& mutex, const WaitingLines& lines, std::function<void()> write)
        : m_mutex(mutex), m_lines(lines), m_write(std::move(write)) {}

    /// Ends the thread and waits for its end. The caller must not hold the mutex.
    ~Flusher();
    Flusher(const Flusher&) = delete;
    Flusher& operator=(const Flusher&) = delete;

    /// Starts the thread. Without memory, or when the system gives no thread, it starts none, and Notice
    /// returns false.
    ///
    /// Call this before any record comes. While the C library starts a thread, it changes the signal mask of
    /// the calling thread. The calling thread may then get a signal that was sent to the process. If the
    /// calling thread is inside the log at that moment, the log loses the crash trace of this signal.
    void Start() noexcept;

    /// Call this with the mutex held, after a line began to wait. Returns false when there is no thread. Then
    /// the caller must write the lines.
    bool Notice();

private:
    void Run();

    std::mutex& m_mutex;
    const WaitingLines& m_lines;
    const std::function<void()> m_write;
    std::condition_variable m_wake;
    std::thread m_thread;
    bool m_isResting = false; ///< The thread waits without a deadline.
    bool m_stop = false;
};

} // namespace BoostLogger
