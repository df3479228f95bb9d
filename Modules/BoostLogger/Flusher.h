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
/// It starts with the first burst. It sleeps without a deadline while nothing waits, and otherwise until the
/// lines are due: in a burst it wakes a thousand times a second, and a record that comes alone does not wake
/// it.
///
/// Threads: see each operation.
class Flusher {
public:
    /// `mutex` guards the lines and what is in here; all that is given outlives the flusher. `write` is
    /// called with the mutex held and must not throw.
    Flusher(std::mutex& mutex, const WaitingLines& lines, std::function<void()> write)
        : m_mutex(mutex), m_lines(lines), m_write(std::move(write)) {}

    /// Waits for the thread. Not while the mutex is held.
    ~Flusher();
    Flusher(const Flusher&) = delete;
    Flusher& operator=(const Flusher&) = delete;

    /// Lines wait now. To be called with the mutex held. False when there is no thread to be had: they are to
    /// be written by the caller.
    bool Notice();

private:
    bool Start();
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
