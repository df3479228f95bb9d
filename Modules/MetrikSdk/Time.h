#pragma once

#include <algorithm>
#include <chrono>

namespace MetrikSdk {

/// A point of wall-clock time as the outbox stores it. Functions that decide by the time take it as an
/// argument named `now`.
using WallTime = std::chrono::sys_time<std::chrono::milliseconds>;

/// For times that must not jump with the wall clock: how often something is tried or reported.
using SteadyTime = std::chrono::steady_clock::time_point;

/// The nearest time that can be computed with, also in nanoseconds: from 1970 to 2262. A person may have
/// edited the file, so a time in it may be any number.
inline WallTime Computable(WallTime time) {
    constexpr WallTime LAST =
        std::chrono::floor<std::chrono::milliseconds>(std::chrono::sys_time<std::chrono::nanoseconds>::max());
    return std::clamp(time, WallTime(), LAST);
}

inline WallTime WallNow() {
    return std::chrono::time_point_cast<std::chrono::milliseconds>(std::chrono::system_clock::now());
}

} // namespace MetrikSdk
