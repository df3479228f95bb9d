#include "Tools/reportctl/send/Pace.h"

#include <gtest/gtest.h>

namespace {

using namespace std::chrono_literals;
using reportctl::send::NextDue;

constexpr std::chrono::steady_clock::time_point NOON{12h};
constexpr reportctl::send::PaceSettings SETTINGS{.perSecond = 100, .catchUp = 30ms};

TEST(Pace, KeepsTheIntervalFromTheLastOne) {
    EXPECT_EQ(NextDue(NOON, NOON + 1ms, SETTINGS), NOON + 10ms);
}

TEST(Pace, MakesUpForASleepThatEndedLate) {
    EXPECT_EQ(NextDue(NOON, NOON + 25ms, SETTINGS), NOON + 10ms);
}

TEST(Pace, DoesNotMakeUpForALongSilence) {
    EXPECT_EQ(NextDue(NOON, NOON + 1h, SETTINGS), NOON + 1h - 30ms);
}

TEST(Pace, LetsTheFirstOneGoAtOnce) {
    EXPECT_LE(NextDue({}, NOON, SETTINGS), NOON);
}

} // namespace
