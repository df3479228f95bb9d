#pragma once

#include <chrono>
#include <thread>

/// Whether `condition` became true before the deadline. It sleeps for a millisecond between two checks. No
/// test sleeps in another way, except when it tests time itself: a lock that is held for seconds, or a pace.
template <typename Condition>
bool WaitUntil(Condition condition, std::chrono::milliseconds deadline = std::chrono::seconds(10)) {
    const auto end = std::chrono::steady_clock::now() + deadline;
    while (!condition()) {
        if (std::chrono::steady_clock::now() > end)
            return false;
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return true;
}
