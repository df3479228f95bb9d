#include "Modules/MetrikSdk/upload/AsideList.h"

#include <gtest/gtest.h>

using namespace MetrikSdk;
using namespace std::chrono_literals;

namespace {

const WallTime NOW{1'700'000'000s};

EventKey Event(std::int64_t row) {
    return {row, "uuid-" + std::to_string(row)};
}

class TheAsideList : public testing::Test {
protected:
    /// The row that is due.
    std::int64_t Due(WallTime now) const { return m_list.Due(now).value_or(EventKey{}).row; }

    AsideSettings m_settings;
    upload::AsideList m_list{m_settings};
};

TEST_F(TheAsideList, TriesAnEventAtOnceWhenOthersWereTakenForTheFirstTime) {
    m_list.Add(Event(7), NOW);
    EXPECT_EQ(Due(NOW), 0);
    EXPECT_EQ(m_list.UntilDue(NOW), 1min);
    m_list.OtherWasTaken();
    EXPECT_EQ(Due(NOW), 7);
    EXPECT_EQ(m_list.Due(NOW)->uuid, "uuid-7");
}

TEST_F(TheAsideList, CountsNoTryWhileNothingIsTaken) {
    m_list.Add(Event(7), NOW);
    for (int i = 0; i < 1000; ++i)
        EXPECT_EQ(m_list.Failed(7, NOW).tries, 0);
    m_list.OtherWasTaken();
    EXPECT_EQ(m_list.Failed(7, NOW).tries, 1);
    EXPECT_FALSE(m_list.Failed(7, NOW).isNew) << "nothing was taken since the try before";
}

TEST_F(TheAsideList, DoublesThePauseUpToTheLongestAndIsOutAfterAllStrikes) {
    m_list.Add(Event(7), NOW);
    std::vector<std::chrono::milliseconds> pauses;
    for (int strike = 1; strike <= m_settings.strikes; ++strike) {
        m_list.OtherWasTaken();
        EXPECT_EQ(m_list.Failed(7, NOW).areOut, strike == m_settings.strikes);
        pauses.push_back(*m_list.UntilDue(NOW));
    }
    EXPECT_EQ(pauses,
              (std::vector<std::chrono::milliseconds>{1min, 2min, 4min, 8min, 16min, 32min, 1h, 1h, 1h, 1h}));
}

TEST_F(TheAsideList, LetsTheRestWaitAgainWhenOneIsTaken) {
    for (const int row : {6, 7, 8, 9})
        m_list.Add(Event(row), NOW);
    m_list.OtherWasTaken();
    m_list.Failed(6, NOW);
    m_list.Taken(7);
    ASSERT_EQ(m_list.Keys().size(), 1U) << "the collector was away when the others stepped aside";
    EXPECT_EQ(m_list.Keys().begin()->first, 6) << "it was not taken while others were";
    EXPECT_EQ(Due(NOW), 0);
    EXPECT_EQ(m_list.UntilDue(NOW), 1min);
    m_list.Add(Event(8), NOW);
    EXPECT_EQ(m_list.Failed(6, NOW).tries, 2) << "the one that was taken counts as another event";
}

TEST_F(TheAsideList, VoidsAllStrikesWhenTheCollectorDoesNotTakeOthersEither) {
    m_settings.strikes = 2;
    upload::AsideList list(m_settings);
    list.Add(Event(7), NOW);
    const auto isOut = [&] {
        list.OtherWasTaken();
        return list.Failed(7, NOW).areOut;
    };
    EXPECT_FALSE(isOut());
    list.OtherFailed();
    EXPECT_FALSE(isOut()) << "it has too much to do, and the event may be a good one";
    list.OtherWasTaken();
    list.OtherFailed();
    EXPECT_TRUE(isOut()) << "the first request after the try was taken";
}

TEST_F(TheAsideList, GivesUpAfterManyTriesAlsoWhenManyOthersAreBad) {
    m_list.Add(Event(7), NOW);
    for (int tries = 1; tries <= m_settings.tries; ++tries) {
        m_list.OtherWasTaken();
        EXPECT_EQ(m_list.Failed(7, NOW).areOut, tries == m_settings.tries);
        m_list.OtherFailed();
    }
    EXPECT_EQ(m_list.UntilDue(NOW), 1h);
}

TEST_F(TheAsideList, DoesNotHoldAnEventWhenTheClockIsSetBack) {
    m_list.Add(Event(7), NOW);
    EXPECT_EQ(Due(NOW - 24h), 7);
}

TEST_F(TheAsideList, ForgetsWhatIsRemoved) {
    m_list.Add(Event(7), NOW);
    m_list.Add(Event(8), NOW);
    m_list.Remove(7);
    EXPECT_EQ(Due(NOW + 1h), 8);
    EXPECT_EQ(m_list.Keys().size(), 1U);
    m_list.Remove(8);
    EXPECT_FALSE(m_list.UntilDue(NOW));
}

TEST_F(TheAsideList, PassesFurtherEventsAndTriesThemOnceThereIsRoom) {
    m_settings.maxEvents = 2;
    upload::AsideList list(m_settings);
    for (const std::int64_t row : {1, 2, 3, 4})
        list.Add(Event(row), NOW);
    EXPECT_EQ(list.Keys().size(), 4U) << "other events are sent before all of them";
    list.OtherWasTaken();
    list.Failed(1, NOW);
    list.Failed(2, NOW);
    EXPECT_FALSE(list.Due(NOW));
    list.Remove(1);
    EXPECT_EQ(list.Due(NOW)->row, 3);
    EXPECT_FALSE(list.Failed(3, NOW).isNew) << "nothing was taken since it was let in";
    list.Taken(2);
    EXPECT_TRUE(list.Keys().empty()) << "neither of them has a failed try that counts";
}

} // namespace
