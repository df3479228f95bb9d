#pragma once

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <limits>
#include <mutex>

#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk::outbox {

/// Wakes one waiting thread when a count has reached the number that the thread waits for. Threads: any may
/// call Set and Stop, one may call Await. While the waiting thread need not be woken, Set takes no lock: it
/// writes one atomic number and reads another.
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

    /// Returns when the count is at least `wanted`, when `deadline` has passed, or after Stop.
    void Await(std::int64_t wanted, SteadyTime deadline) {
        std::unique_lock lock(m_mutex);
        m_wanted = wanted; // set before the count is read, because Set writes the count before it reads this
        m_wake.wait_until(lock, deadline, [&] { return m_stopped || m_value >= wanted; });
        m_wanted = NEVER;
    }

private:
    void Notify() {
        const std::lock_guard lock(m_mutex); // the waiter is now either before its check or in its wait
        m_wake.notify_all();
    }

    std::atomic<std::int64_t> m_value = 0;
    std::atomic<std::int64_t> m_wanted = NEVER;
    std::atomic<bool> m_stopped = false;
    /// The waiter holds it from its check until its wait begins, so that no Notify between them is lost.
    std::mutex m_mutex;
    std::condition_variable m_wake;
};

} // namespace MetrikSdk::outbox
