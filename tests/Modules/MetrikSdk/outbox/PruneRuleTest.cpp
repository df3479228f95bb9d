#include "Modules/MetrikSdk/outbox/PruneRule.h"

#include <gtest/gtest.h>

using namespace MetrikSdk;
using namespace std::chrono_literals;

namespace {

const WallTime OPENED{std::chrono::days(20'000)};

CapSettings Caps() {
    CapSettings caps;
    caps.maxWaitingBytes = 10'000;
    caps.maxAge = std::chrono::days(30);
    return caps;
}

TEST(PruneRule, LeavesAnOutboxAtItsCapAlone) {
    EXPECT_EQ(outbox::PruneRule::ExcessBytes(10'000, Caps()), 0);
}

TEST(PruneRule, WantsTheExcessAndAHundredthOfTheCapGone) {
    EXPECT_EQ(outbox::PruneRule::ExcessBytes(10'500, Caps()), 600);
}

TEST(PruneRule, AllowsThirtyDays) {
    EXPECT_EQ(outbox::PruneRule::OldestAllowed(OPENED + 24h, OPENED, 24h, Caps()),
              OPENED - std::chrono::days(29));
}

TEST(PruneRule, DoesNotBelieveAClockThatJumpsAhead) {
    EXPECT_EQ(outbox::PruneRule::OldestAllowed(OPENED + std::chrono::days(4000), OPENED, 1h, Caps()),
              OPENED + 1h - std::chrono::days(30));
}

TEST(PruneRule, BelievesAClockThatGoesBack) {
    EXPECT_EQ(outbox::PruneRule::OldestAllowed(OPENED - 24h, OPENED, 1h, Caps()),
              OPENED - std::chrono::days(31));
}

/// Whether events may be dropped for their age after this time of checks once a minute, in which the wall
/// clock jumps once.
bool MayDropAfter(std::chrono::minutes minutes, std::chrono::minutes stepAt, std::chrono::hours step) {
    const SteadyTime start{100h};
    auto watch = outbox::PruneRule::BeginWatch(OPENED, start);
    for (auto minute = 1min; minute <= minutes; ++minute) {
        const auto stepped = minute >= stepAt ? step : 0h;
        watch = outbox::PruneRule::LookAgain(watch, OPENED + minute + stepped, start + minute);
    }
    return outbox::PruneRule::MayDropByAge(watch, Caps());
}

TEST(PruneRule, CallsNothingOldBeforeTheClocksHaveAgreedForAnHour) {
    EXPECT_FALSE(MayDropAfter(59min, 59min, 0h));
    EXPECT_TRUE(MayDropAfter(60min, 60min, 0h));
}

TEST(PruneRule, BeginsTheHourAnewWithEveryStepOfTheClock) {
    for (const auto step : {std::chrono::hours(-24 * 4000), std::chrono::hours(24 * 4000), 1h}) {
        EXPECT_FALSE(MayDropAfter(80min, 30min, step));
        EXPECT_TRUE(MayDropAfter(90min, 30min, step));
    }
}

TEST(PruneRule, TakesSlewingOverAMonthForAgreement) {
    const SteadyTime start{100h};
    const auto month = std::chrono::days(30);
    const auto watch = outbox::PruneRule::LookAgain(outbox::PruneRule::BeginWatch(OPENED, start),
                                                    OPENED + month + 20min, start + month);
    EXPECT_TRUE(outbox::PruneRule::MayDropByAge(watch, Caps()));
}

} // namespace
