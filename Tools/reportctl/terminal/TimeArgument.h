#pragma once

#include <chrono>
#include <string>

namespace reportctl::terminal {

using TimePoint = std::chrono::time_point<std::chrono::system_clock, std::chrono::milliseconds>;

/// The forms in which a person may write a point in time, for a command's help.
inline constexpr auto TIME_FORMS =
    "10m, 2h or 90d back from now, or a date or date-time such as 2026-11-21, 2026-11-21T14:05 or "
    "2026-11-21T14:05:06Z; local time unless it ends in Z or an offset such as +01:00";

/// Reads a point in time that a person wrote, in one of TIME_FORMS. It also accepts `s` for seconds and `w`
/// for weeks. A date without a time means the first moment of that day.
///
/// Throws std::invalid_argument for any other text, with a message that names the right forms.
TimePoint ReadTime(const std::string& text, TimePoint now);

/// The time that is so many milliseconds since 1970.
inline TimePoint At(std::int64_t milliseconds) {
    return TimePoint(std::chrono::milliseconds(milliseconds));
}

/// The time in milliseconds since 1970, the unit of createTime.
inline std::int64_t MillisecondsOf(TimePoint time) {
    return time.time_since_epoch().count();
}

} // namespace reportctl::terminal
