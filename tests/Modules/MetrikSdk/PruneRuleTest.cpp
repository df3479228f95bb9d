#include "Modules/MetrikSdk/PruneRule.h"

#include <gtest/gtest.h>

using namespace Metrik;
using namespace std::chrono_literals;

namespace {

const WallTime OPENED{std::chrono::days(20'000)};

CapSettings Caps() {
    CapSettings caps;
    caps.maxWaitingBytes = 10'000;
    caps.maxAge = std::chrono::days(30);
    caps.dropRunEnds = 10min;
    return caps;
}

TEST(PruneRule, LeavesAnOutboxAtItsCapAlone) {
    EXPECT_EQ(PruneRule::ExcessBytes(10'000, Caps()), 0);
}

TEST(PruneRule, WantsTheExcessAndAHundredthOfTheCapGone) {
    EXPECT_EQ(PruneRule::ExcessBytes(10'500, Caps()), 600);
}

TEST(PruneRule, AllowsThirtyDays) {
    EXPECT_EQ(PruneRule::OldestAllowed(OPENED + 24h, OPENED, 24h, Caps()), OPENED - std::chrono::days(29));
}

TEST(PruneRule, DoesNotBelieveAClockThatJumpsAhead) {
    EXPECT_EQ(PruneRule::OldestAllowed(OPENED + std::chrono::days(4000), OPENED, 1h, Caps()),
              OPENED + 1h - std::chrono::days(30));
}

TEST(PruneRule, BelievesAClockThatGoesBack) {
    EXPECT_EQ(PruneRule::OldestAllowed(OPENED - 24h, OPENED, 1h, Caps()), OPENED - std::chrono::days(31));
}

TEST(PruneRule, TellsTheFirstDropOfARunOnly) {
    const SteadyTime now{100h};
    EXPECT_TRUE(PruneRule::BeginsRun(std::nullopt, now, Caps()));
    EXPECT_FALSE(PruneRule::BeginsRun(now - 10min, now, Caps()));
    EXPECT_TRUE(PruneRule::BeginsRun(now - 11min, now, Caps()));
}

} // namespace
