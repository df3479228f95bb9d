#pragma once

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <limits>
#include <mutex>

#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk::outbox {

/// Wakes one waiting thread when a count has grown far enough for it. Threads: Set and Stop by any, Await by
/// one. As long as the waiting thread needs no waking, Set takes no lock: it writes one atomic number and
/// reads another.
class CountWaiter {
public:
    static constexpr std::int64_t NEVER = std::numeric_limits<std::int64_t>::max();

    /// The count is now `value`.
    void Set(std::int64_t value) {
        m_value = value;
        if (value >= m_wanted)
            Notify();
    }

    /// From now on, Await returns at once.
    void Stop() {
        m_stopped = true;
        Notify();
    }

    bool Stopped() const { return m_stopped; }

    /// Returns when the count is at least `wanted`, at `deadline`, or after Stop.
    void Await(std::int64_t wanted, SteadyTime deadline) {
        std::unique_lock lock(m_mutex);
        m_wanted = wanted; // before the count is read: Set writes and reads in the opposite order
        m_wake.wait_until(lock, deadline, [&] { return m_stopped || m_value >= wanted; });
        m_wanted = NEVER;
    }

private:
    void Notify() {
        const std::lock_guard lock(m_mutex); // the waiter is either before its check or in its wait
        m_wake.notify_all();
    }

    std::atomic<std::int64_t> m_value = 0;
    std::atomic<std::int64_t> m_wanted = NEVER;
    std::atomic<bool> m_stopped = false;
    std::mutex
        m_mutex; ///< Held by the waiter between its check and its wait, so that Notify cannot fall between.
    std::condition_variable m_wake;
};

} // namespace MetrikSdk::outbox
