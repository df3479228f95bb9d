#include "Tools/reportctl/terminal/WrittenTime.h"

#include <ctime>

#include <fmt/format.h>

namespace reportctl::terminal {
namespace {

constexpr std::int64_t SECOND_MS = 1000;

std::int64_t FractionOf(TimePoint time) {
    return (MillisecondsOf(time) % SECOND_MS + SECOND_MS) % SECOND_MS; // also before 1970
}

std::time_t SecondsOf(TimePoint time) {
    return static_cast<std::time_t>((MillisecondsOf(time) - FractionOf(time)) / SECOND_MS);
}

std::tm LocalPartsOf(TimePoint time) {
    const auto seconds = SecondsOf(time);
    std::tm parts{};
    ::localtime_r(&seconds, &parts);
    return parts;
}

std::string Text(const std::tm& parts, char separator, std::int64_t milliseconds) {
    constexpr int FIRST_YEAR = 1900;
    return fmt::format("{:04}-{:02}-{:02}{}{:02}:{:02}:{:02}.{:03}", parts.tm_year + FIRST_YEAR,
                       parts.tm_mon + 1, parts.tm_mday, separator, parts.tm_hour, parts.tm_min, parts.tm_sec,
                       milliseconds);
}

} // namespace

std::string UtcTime(TimePoint time) {
    const auto seconds = SecondsOf(time);
    std::tm parts{};
    ::gmtime_r(&seconds, &parts);
    return Text(parts, 'T', FractionOf(time)) + 'Z';
}

std::string ZonedTime(TimePoint time) {
    constexpr int MINUTE = 60;
    const auto parts = LocalPartsOf(time);
    const auto minutes = parts.tm_gmtoff / MINUTE;
    const auto size = minutes < 0 ? -minutes : minutes;
    return fmt::format("{}{}{:02}:{:02}", Text(parts, 'T', FractionOf(time)), minutes < 0 ? '-' : '+',
                       size / MINUTE, size % MINUTE);
}

std::string LocalTime(TimePoint time) {
    return Text(LocalPartsOf(time), ' ', FractionOf(time));
}

} // namespace reportctl::terminal
