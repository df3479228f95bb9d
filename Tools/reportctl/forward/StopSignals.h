#pragma once

#include <chrono>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <thread>

namespace reportctl::forward {

/// Ctrl-C and SIGTERM, for a command that may be in the middle of a request: while this lives, a thread takes
/// the signals, calls `abandon`, and wakes Wait. Threads that are started meanwhile have the signals blocked,
/// too.
///
/// One at a time. `abandon` is called by the thread and must not throw.
class StopSignals {
public:
    explicit StopSignals(std::function<void()> abandon);
    ~StopSignals();
    StopSignals(const StopSignals&) = delete;
    StopSignals& operator=(const StopSignals&) = delete;

    /// Waits so long. False when a signal has come, before or meanwhile.
    bool Wait(std::chrono::milliseconds time);

private:
    void Take();

    std::function<void()> m_abandon;
    std::mutex m_mutex; ///< Guards m_hasCome.
    std::condition_variable m_wake;
    bool m_hasCome = false;
    std::thread m_thread;
};

} // namespace reportctl::forward
