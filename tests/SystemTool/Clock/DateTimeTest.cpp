#include "SystemTool/Clock/DateTime.h"

#include <cstdlib>
#include <ctime>

#include <gtest/gtest.h>

using SystemTool::Clock::DateTime;

namespace {

using namespace std::chrono_literals;

class DateTimeInUtc : public ::testing::Test {
protected:
    void SetUp() override {
        ::setenv("TZ", "UTC", 1);
        ::tzset();
    }

    static DateTime At(std::chrono::milliseconds sinceEpoch) {
        return DateTime(DateTime::TimePoint(sinceEpoch));
    }
};

} // namespace

TEST_F(DateTimeInUtc, ShowsMillisecondsInThreeDigits) {
    EXPECT_EQ(At(1700000000007ms).ToString("%Y-%m-%d %H:%M:%S:%i"), "2023-11-14 22:13:20:007");
    EXPECT_EQ(At(1700000000120ms).ToString("%i%i"), "120120");
}

TEST_F(DateTimeInUtc, LeavesDoubledPercentSignsToTheirMeaning) {
    EXPECT_EQ(At(5ms).ToString("%%i %i %%"), "%i 005 %");
}

TEST_F(DateTimeInUtc, CountsMillisecondsForwardsBeforeTheEpochToo) {
    EXPECT_EQ(At(-1ms).ToString("%Y-%m-%d %H:%M:%S:%i"), "1969-12-31 23:59:59:999");
}

TEST(DateTime, ShowsLocalTime) {
    ::setenv("TZ", "XXX-05:30", 1);
    ::tzset();
    EXPECT_EQ(DateTime(DateTime::TimePoint(0ms)).ToString("%H:%M"), "05:30");
}

TEST(DateTime, NowIsTheSystemClocksTime) {
    const auto seconds = [] { // std::time has a coarser clock, which may be behind
        using std::chrono::system_clock;
        return system_clock::to_time_t(std::chrono::floor<std::chrono::seconds>(system_clock::now()));
    };
    const auto before = seconds();
    const auto shown = std::stoll(DateTime::Now().ToString("%s"));
    EXPECT_GE(shown, before);
    EXPECT_LE(shown, seconds());
}
