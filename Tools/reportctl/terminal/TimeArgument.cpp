#include "Tools/reportctl/terminal/TimeArgument.h"

#include <charconv>
#include <ctime>
#include <optional>
#include <regex>
#include <stdexcept>

#include <fmt/format.h>

namespace reportctl::terminal {
namespace {

using std::chrono::milliseconds;
using std::chrono::minutes;
using std::chrono::seconds;

[[noreturn]] void Refuse(const std::string& text, const std::string& reason) {
    throw std::invalid_argument(fmt::format("\"{}\" is no time{}: write {}", text, reason, TIME_FORMS));
}

int Number(const std::ssub_match& digits) {
    int number = 0;
    std::from_chars(&*digits.first, &*digits.first + digits.length(), number);
    return number;
}

seconds UnitOf(char letter) {
    switch (letter) {
    case 's':
        return seconds(1);
    case 'm':
        return minutes(1);
    case 'h':
        return std::chrono::hours(1);
    case 'd':
        return std::chrono::days(1);
    default:
        return std::chrono::weeks(1);
    }
}

std::optional<TimePoint> ReadAge(const std::string& text, TimePoint now) {
    static const std::regex form("([0-9]{1,7})([smhdw])");
    std::smatch part;
    if (!std::regex_match(text, part, form))
        return std::nullopt;
    return now - Number(part[1]) * UnitOf(*part[2].first);
}

/// A fraction of a second from its one to three digits: ".5" is half a second.
milliseconds Fraction(const std::ssub_match& digits) {
    auto padded = digits.str();
    padded.resize(3, '0');
    return milliseconds(std::stoi(padded));
}

seconds OffsetOf(const std::string& zone) {
    const auto hours = std::stoi(zone.substr(1, 2));
    const auto rest = std::stoi(zone.substr(zone.size() - 2));
    const auto offset = std::chrono::hours(hours) + minutes(rest);
    return zone[0] == '-' ? -offset : offset;
}

/// The moment at which a clock in this zone shows this time; an empty zone is local time. When summer time
/// ends, an hour comes twice; the C library chooses which one is meant.
TimePoint MomentOf(std::tm wall, const std::string& zone) {
    if (zone.empty()) {
        wall.tm_isdst = -1;
        return TimePoint(seconds(::mktime(&wall)));
    }
    const TimePoint utc(seconds(::timegm(&wall)));
    return zone == "Z" ? utc : utc - OffsetOf(zone);
}

/// Whether the calendar has this day. mktime alone would turn the 31st of February into a day of March.
bool IsDay(const std::tm& wall) {
    using namespace std::chrono;
    return year_month_day(year(wall.tm_year + 1900), month(static_cast<unsigned>(wall.tm_mon + 1)),
                          day(static_cast<unsigned>(wall.tm_mday)))
        .ok();
}

std::optional<TimePoint> ReadDate(const std::string& text) {
    static const std::regex form(
        "([0-9]{4})-([0-9]{2})-([0-9]{2})"
        "(?:[T ]([01][0-9]|2[0-3]):([0-5][0-9])(?::([0-5][0-9])(?:\\.([0-9]{1,3}))?)?"
        "(Z|[+-](?:0[0-9]|1[0-4]):?[0-5][0-9])?)?");
    std::smatch part;
    if (!std::regex_match(text, part, form))
        return std::nullopt;
    const auto number = [&](std::size_t group) { return part[group].matched ? Number(part[group]) : 0; };
    std::tm wall{};
    wall.tm_year = number(1) - 1900;
    wall.tm_mon = number(2) - 1;
    wall.tm_mday = number(3);
    wall.tm_hour = number(4);
    wall.tm_min = number(5);
    wall.tm_sec = number(6);
    if (!IsDay(wall))
        Refuse(text, ", the calendar has no such day");
    const auto fraction = part[7].matched ? Fraction(part[7]) : milliseconds(0);
    return MomentOf(wall, part[8].str()) + fraction;
}

} // namespace

TimePoint ReadTime(const std::string& text, TimePoint now) {
    if (const auto time = ReadAge(text, now))
        return *time;
    if (const auto time = ReadDate(text))
        return *time;
    Refuse(text, "");
}

} // namespace reportctl::terminal
