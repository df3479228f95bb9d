#pragma once

#include <chrono>
#include <string>

namespace SystemTool::Clock {

/// A point in time with millisecond resolution, shown in local time. A value: copy it freely, use it from any
/// thread.
class DateTime {
public:
    using TimePoint = std::chrono::time_point<std::chrono::system_clock, std::chrono::milliseconds>;

    explicit DateTime(TimePoint time) : m_time(time) {}

    static DateTime Now();

    /// The local time, by a format of strftime(3) in which %i stands for the milliseconds in three digits.
    std::string ToString(const std::string& format) const;

private:
    TimePoint m_time;
};

} // namespace SystemTool::Clock
