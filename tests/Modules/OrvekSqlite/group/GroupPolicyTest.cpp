#include <gtest/gtest.h>

#include "Modules/OrvekSqlite/group/GroupPolicy.h"
#include "Modules/OrvekSqlite/group/KeptStatements.h"

namespace {

using namespace std::chrono_literals;
using OrvekSqlite::GroupSettings;
using OrvekSqlite::group::Clock;
using OrvekSqlite::group::GroupPolicy;
using OrvekSqlite::group::KeptStatements;

const Clock::time_point NOW = Clock::time_point() + 1h;

TEST(GroupPolicy, TakesTheFirstStatementAndOneAfterTenMillisecondsForAlone) {
    const GroupPolicy policy{GroupSettings()};
    EXPECT_TRUE(policy.IsAlone(std::nullopt, NOW));
    EXPECT_TRUE(policy.IsAlone(NOW - 10ms, NOW));
    EXPECT_FALSE(policy.IsAlone(NOW - 10ms + 1ns, NOW));
    EXPECT_FALSE(policy.IsAlone(NOW, NOW));
}

TEST(GroupPolicy, CompletesAGroupByItsNumberItsBytesOrItsAge) {
    const GroupPolicy policy{GroupSettings()};
    EXPECT_FALSE(policy.IsComplete(999, 4'194'303, NOW, NOW));
    EXPECT_TRUE(policy.IsComplete(1000, 0, NOW, NOW));
    EXPECT_TRUE(policy.IsComplete(1, 4'194'304, NOW, NOW));
    EXPECT_FALSE(policy.IsComplete(1, 1, NOW, policy.Due(NOW) - 1ns));
    EXPECT_TRUE(policy.IsComplete(1, 1, NOW, policy.Due(NOW)));
}

TEST(GroupPolicy, HasACommitDueWithinTenMilliseconds) {
    EXPECT_LT(GroupPolicy{GroupSettings()}.Due(NOW), NOW + 10ms);
}

TEST(GroupPolicy, TriesAnOwedGroupTenTimesASecond) {
    EXPECT_EQ(GroupPolicy{GroupSettings()}.NextTry(NOW), NOW + 100ms);
}

TEST(GroupPolicy, LeavesTheLockFreeForAsLongAsItWasHeldButNotForSeconds) {
    const GroupPolicy policy{GroupSettings()};
    EXPECT_EQ(policy.Pause(4ms), 4ms);
    EXPECT_EQ(policy.Pause(3s), 10ms);
}

TEST(KeptStatements, AreGivenBackInTheirOrderAndLengths) {
    KeptStatements kept;
    for (const auto* text : {"a", "", "ccc"}) {
        kept.Reserve(text);
        kept.Add(text);
    }
    ASSERT_EQ(kept.Count(), 3u);
    EXPECT_EQ(kept.Bytes(), 4u);
    EXPECT_EQ(kept[0] + "|" + kept[1] + "|" + kept[2], "a||ccc");
    kept.Clear();
    EXPECT_TRUE(kept.IsEmpty());
    EXPECT_EQ(kept.Bytes(), 0u);
}

TEST(KeptStatements, CloseTheGapThatARemovedOneLeaves) {
    KeptStatements kept;
    for (const auto* text : {"first", "second", "third", "fourth"})
        kept.Add(text);
    kept.Remove(1);
    kept.Remove(0);
    ASSERT_EQ(kept.Count(), 2u);
    EXPECT_EQ(kept[0] + kept[1], "thirdfourth");
    kept.Remove(1);
    kept.Add("fifth");
    EXPECT_EQ(kept[0] + kept[1], "thirdfifth");
}

} // namespace
