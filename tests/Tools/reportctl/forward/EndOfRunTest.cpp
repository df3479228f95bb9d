#include "Tools/reportctl/forward/EndOfRun.h"

#include <gtest/gtest.h>

using namespace std::chrono_literals;
using reportctl::forward::EndOfRun;
using reportctl::forward::Step;
using Kind = Step::Kind;

namespace {

const MetrikSdk::WallTime BEGUN{1h};

TEST(EndOfRun, IsWhenThereIsNothingToSend) {
    EndOfRun end(BEGUN);
    EXPECT_FALSE(end.IsOver({Kind::Taken, 0ms}, BEGUN));
    EXPECT_TRUE(end.IsOver({Kind::Idle, 30s}, BEGUN));
    EXPECT_FALSE(end.HasFailed());
}

TEST(EndOfRun, IsAtTheThirdRequestInARowThatReachesNothing) {
    const Step unreachable{Kind::Unreachable, 1s};
    EndOfRun end(BEGUN);
    EXPECT_FALSE(end.IsOver(unreachable, BEGUN));
    EXPECT_FALSE(end.IsOver(unreachable, BEGUN));
    EXPECT_FALSE(end.IsOver({Kind::Taken, 0s}, BEGUN));
    EXPECT_FALSE(end.IsOver(unreachable, BEGUN));
    EXPECT_FALSE(end.IsOver(unreachable, BEGUN));
    EXPECT_TRUE(end.IsOver(unreachable, BEGUN));
    EXPECT_TRUE(end.HasFailed());
}

TEST(EndOfRun, IsAtOnceWhenTheStoreCannotBeRead) {
    EndOfRun end(BEGUN);
    EXPECT_TRUE(end.IsOver({Kind::Trouble, 0s}, BEGUN));
    EXPECT_TRUE(end.HasFailed());
}

TEST(EndOfRun, WaitsForASearchAsLongAsItComesSomewhere) {
    EndOfRun end(BEGUN);
    EXPECT_FALSE(end.IsOver({Kind::Searching, 2s}, BEGUN + 57s));
    EXPECT_FALSE(end.IsOver({Kind::Taken, 0s}, BEGUN + 58s));
    EXPECT_FALSE(end.IsOver({Kind::Searching, 2s}, BEGUN + 115s));
    EXPECT_TRUE(end.IsOver({Kind::Searching, 2s}, BEGUN + 117s));
    EXPECT_TRUE(end.HasFailed());
}

TEST(EndOfRun, IsAtOnceWhenTheCollectorWantsALongWait) {
    EndOfRun end(BEGUN);
    EXPECT_TRUE(end.IsOver({Kind::Searching, 10min}, BEGUN));
    EXPECT_TRUE(end.HasFailed());
}

TEST(EndOfRun, IsWhenTheCollectorRefusesTenRowsInARow) {
    EndOfRun end(BEGUN);
    for (int i = 0; i < 9; ++i)
        EXPECT_FALSE(end.IsOver({Kind::Refused, 0ms}, BEGUN));
    EXPECT_TRUE(end.IsOver({Kind::Refused, 0ms}, BEGUN));
    EXPECT_TRUE(end.HasFailed());
}

} // namespace
