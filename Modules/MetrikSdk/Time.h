#pragma once

#include <algorithm>
#include <chrono>

namespace MetrikSdk {

/// A point of wall-clock time as the outbox stores it. Decisions take it as an argument named `now`.
using WallTime = std::chrono::sys_time<std::chrono::milliseconds>;

/// For what must not jump with the wall clock: how often something is tried or told.
using SteadyTime = std::chrono::steady_clock::time_point;

/// The nearest time that can be computed with, in nanoseconds too: from 1970 to 2262. A file that a person
/// has edited may hold any number.
inline WallTime Computable(WallTime time) {
    constexpr WallTime LAST =
        std::chrono::floor<std::chrono::milliseconds>(std::chrono::sys_time<std::chrono::nanoseconds>::max());
    return std::clamp(time, WallTime(), LAST);
}

inline WallTime WallNow() {
    return std::chrono::time_point_cast<std::chrono::milliseconds>(std::chrono::system_clock::now());
}

} // namespace MetrikSdk
