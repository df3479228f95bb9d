#pragma once

#include <cstdint>
#include <fstream>
#include <string>
#include <vector>

#include <time.h>

/// Raw nanoseconds, because programs exchange them in files.
inline std::int64_t NowNs(clockid_t clock) {
    timespec now{};
    ::clock_gettime(clock, &now);
    return std::int64_t{now.tv_sec} * 1'000'000'000 + now.tv_nsec;
}

/// The clock that all programs of a machine share and no program sets.
inline std::int64_t MonotonicNs() {
    return NowNs(CLOCK_MONOTONIC);
}

inline void SleepUntil(std::int64_t monotonicNs) {
    const timespec until{monotonicNs / 1'000'000'000, monotonicNs % 1'000'000'000};
    ::clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &until, nullptr);
}

/// Writes the stamps as they are in memory. Writes no file when there are none.
inline void WriteStamps(const std::string& path, const std::vector<std::int64_t>& stamps) {
    if (stamps.empty())
        return;
    std::ofstream file(path, std::ios::binary);
    file.write(reinterpret_cast<const char*>(stamps.data()),
               static_cast<std::streamsize>(stamps.size() * sizeof stamps.front()));
}
