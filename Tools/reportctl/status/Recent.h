#pragma once

#include <chrono>
#include <cstdint>

namespace reportctl::status {

/// How long a fault counts in the verdict.
inline constexpr std::chrono::milliseconds RECENT = std::chrono::minutes(10);

/// What happens while the status is gathered is a little later than the status's own time.
inline constexpr std::chrono::milliseconds LONGEST_LOOK = std::chrono::seconds(10);

/// Whether a time, in milliseconds since 1970, is in the last ten minutes. A later time is not: the clock was
/// set back, and when that was is not known.
inline constexpr bool IsRecent(std::int64_t atMs, std::int64_t nowMs) {
    return atMs - nowMs <= LONGEST_LOOK.count() && nowMs - atMs <= RECENT.count();
}

} // namespace reportctl::status
