#pragma once

#include <condition_variable>
#include <functional>
#include <mutex>
#include <optional>
#include <thread>

#include "Modules/BoostLogger/WaitingLines.h"

namespace BoostLogger {

/// The thread that writes waiting lines when no further line comes that would.
///
/// It sleeps without a deadline while no line waits, and otherwise until the lines are due. In a burst it
/// wakes a thousand times a second. A record that comes alone does not wake it.
///
/// Threads: see each operation.
class Flusher {
public:
    /// `mutex` guards the lines and what is in here; all that is given outlives the flusher. `write` is
    /// called with the mutex held and must not throw.
    Flusher(std::mutex& mutex, const WaitingLines& lines, std::function<void()> write)
        : m_mutex(mutex), m_lines(lines), m_write(std::move(write)) {}

    /// Waits for the thread's end. The caller must not hold the mutex.
    ~Flusher();
    Flusher(const Flusher&) = delete;
    Flusher& operator=(const Flusher&) = delete;

    /// Starts the thread, if the system has one to give. Call this before there are records: the C library
    /// changes the signal mask while it starts a thread, so the thread that called may get a signal that was
    /// meant for the process. A crash trace is lost when its signal comes to a thread that is in the log.
    void Start() noexcept;

    /// Call this with the mutex held, after a line was added. False when there is no thread: then the caller
    /// must write the lines.
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
