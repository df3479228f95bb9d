#include "Tools/reportctl/terminal/TimeArgument.h"

#include <cstdlib>
#include <ctime>
#include <stdexcept>

#include <gtest/gtest.h>

namespace {

using reportctl::terminal::MillisecondsOf;
using reportctl::terminal::ReadTime;
using reportctl::terminal::TimePoint;
using std::chrono::milliseconds;

const TimePoint NOW(milliseconds(1700000000123));

/// Sets the time zone of the process while this object exists.
class TimeZone {
public:
    explicit TimeZone(const char* zone) {
        ::setenv("TZ", zone, 1);
        ::tzset();
    }
    ~TimeZone() {
        ::unsetenv("TZ");
        ::tzset();
    }
    TimeZone(const TimeZone&) = delete;
    TimeZone& operator=(const TimeZone&) = delete;
};

std::int64_t Read(const std::string& text) {
    return MillisecondsOf(ReadTime(text, NOW));
}

std::string Refusal(const std::string& text) {
    try {
        ReadTime(text, NOW);
    } catch (const std::invalid_argument& error) {
        return error.what();
    }
    return "(accepted)";
}

TEST(TimeArgument, CountsAnAgeBackFromNow) {
    EXPECT_EQ(Read("30s"), 1700000000123 - 30'000);
    EXPECT_EQ(Read("10m"), 1700000000123 - 600'000);
    EXPECT_EQ(Read("2h"), 1700000000123 - 7'200'000);
    EXPECT_EQ(Read("90d"), 1700000000123 - 90LL * 86'400'000);
    EXPECT_EQ(Read("1w"), 1700000000123 - 7LL * 86'400'000);
}

TEST(TimeArgument, TakesADateForItsFirstMomentInLocalTime) {
    const TimeZone zone("UTC-1"); // one hour east of UTC: POSIX reverses the sign
    EXPECT_EQ(Read("1970-01-02"), 86'400'000 - 3'600'000);
    EXPECT_EQ(Read("1970-01-02T01:00"), 86'400'000);
    EXPECT_EQ(Read("1970-01-02 01:00:01.5"), 86'400'000 + 1'500);
}

TEST(TimeArgument, FollowsSummerTime) {
    const TimeZone zone("CET-1CEST,M3.5.0,M10.5.0/3");
    EXPECT_EQ(Read("2026-07-01T12:00"), Read("2026-07-01T10:00Z"));
    EXPECT_EQ(Read("2026-01-01T12:00"), Read("2026-01-01T11:00Z"));
}

TEST(TimeArgument, TakesTheZoneThatIsWritten) {
    const TimeZone zone("UTC-5");
    EXPECT_EQ(Read("2023-11-14T22:13:20Z"), 1700000000000);
    EXPECT_EQ(Read("2023-11-14T23:13:20.123+01:00"), 1700000000123);
    EXPECT_EQ(Read("2023-11-14T17:13:20-0500"), 1700000000000);
}

TEST(TimeArgument, TakesTimesBefore1970) {
    EXPECT_EQ(Read("1969-12-31T23:59:59.999Z"), -1);
}

TEST(TimeArgument, SaysOfAnythingElseWhatWouldBeRight) {
    for (const auto* text :
         {"", "10", "m", "-10m", "10 m", "12345678d", "yesterday", "2026-1-1", "2026-11-21T24:00",
          "2026-11-21T14", "2026-11-21Z", "20261121", "2026-11-21T14:05:06+1", "10m "})
        EXPECT_EQ(Refusal(text).rfind("\"" + std::string(text) + "\" is no time: write 10m, 2h or 90d", 0),
                  0u)
            << Refusal(text);
}

TEST(TimeArgument, RefusesADayThatTheCalendarDoesNotHave) {
    for (const auto* text : {"2026-02-29", "2026-13-01", "2026-00-10", "2026-04-31T10:00Z"})
        EXPECT_NE(Refusal(text).find("the calendar has no such day"), std::string::npos) << Refusal(text);
}

} // namespace
