#pragma once

#include <chrono>
#include <mutex>
#include <thread>

namespace SystemTool::Clock {

/// Locks `mutex`. When another thread keeps it until `deadline`, the result owns no lock. It tries at least
/// once, also when the deadline is over.
///
/// It tries again every millisecond. A mutex that can be waited for with a deadline is slower in every use,
/// and this function is for the end of an object's life.
///
/// Threads: any.
inline std::unique_lock<std::mutex> LockBefore(std::mutex& mutex,
                                               std::chrono::steady_clock::time_point deadline) {
    std::unique_lock lock(mutex, std::try_to_lock);
    while (!lock && std::chrono::steady_clock::now() < deadline) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
        (void)lock.try_lock();
    }
    return lock;
}

} // namespace SystemTool::Clock
