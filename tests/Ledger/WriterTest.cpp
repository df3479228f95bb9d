#include "Ledger/Writer.h"

#include <gtest/gtest.h>

#include "Ledger/Counts.h"
#include "tests/Ledger/LedgerFixture.h"

using namespace ReportLedger;

// What is counted, and what the next start does with the counts.

namespace {

class LedgerWriter : public LedgerFixture {};

} // namespace

TEST_F(LedgerWriter, CountsInMemoryUntilItHasAFile) {
    Writer writer;
    TakeAndEnd(writer, Outcome::Stored);
    EXPECT_EQ(LookAt(writer.Content(), true, NOW_MS).total[RECEIVED], 1U);
    EXPECT_FALSE(std::filesystem::exists(Path()));
}

TEST_F(LedgerWriter, CountsDatagramsAndWhatIsSpecialAboutThem) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    writer.Received(0, false, NOW_MS);
    Take(writer);
    writer.Received(10240, true, NOW_MS + 7);
    writer.CouldNotFormat();
    writer.Queued();
    const auto look = Look();
    EXPECT_EQ(look.total[RECEIVED], 3U);
    EXPECT_EQ(look.total[RECEIVED_BYTES], 10340U);
    EXPECT_EQ(look.total[EMPTY], 1U);
    EXPECT_EQ(look.total[AT_SIZE_LIMIT], 1U);
    EXPECT_EQ(look.total[UNFORMATTABLE], 1U);
    EXPECT_EQ(look.lastMs[RECEIVED], static_cast<std::uint64_t>(NOW_MS + 7));
    EXPECT_EQ(WaitingIn(look.total), 2U);
    EXPECT_TRUE(look.balanced);
}

TEST_F(LedgerWriter, CountsEachOutcomeInItsPlaceWithItsTime) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    for (unsigned place = FIRST_OUTCOME; place <= LAST_OUTCOME; ++place) {
        for (unsigned i = 0; i < place; ++i)
            TakeAndEnd(writer, static_cast<Outcome>(place), NOW_MS + place);
        const auto look = Look();
        EXPECT_EQ(look.total[place], place);
        EXPECT_EQ(look.lastMs[place], static_cast<std::uint64_t>(NOW_MS + place));
        EXPECT_EQ(look.lastMs[place + 1], 0U) << "the next one's turn has not come";
        EXPECT_TRUE(look.balanced);
        EXPECT_EQ(WaitingIn(look.total), 0U);
    }
}

TEST_F(LedgerWriter, AReportThatDoesNotReachTheQueueEndsAsAnException) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    writer.Received(100, false, NOW_MS);
    EXPECT_TRUE(Look().balanced) << "the receiving thread has it";
    EXPECT_EQ(WaitingIn(Look().total), 0U);
    writer.CouldNotQueue(NOW_MS);
    const auto look = Look();
    EXPECT_EQ(Of(look.total, Outcome::Exception), 1U);
    EXPECT_EQ(look.total[RECEIVING], 0U);
    EXPECT_TRUE(look.balanced);
}

TEST_F(LedgerWriter, KeepsTheMostThatEverWaited) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    for (int i = 0; i < 5; ++i)
        Take(writer);
    for (int i = 0; i < 3; ++i)
        writer.Ended(Outcome::Stored, NOW_MS);
    EXPECT_EQ(Look().total[MOST_WAITING], 5U);
    for (int i = 0; i < 2; ++i)
        Take(writer);
    EXPECT_EQ(WaitingIn(Look().total), 4U);
    EXPECT_EQ(Look().total[MOST_WAITING], 5U) << "four never were more than five";
    for (int i = 0; i < 2; ++i)
        Take(writer);
    EXPECT_EQ(Look().total[MOST_WAITING], 6U);
}

TEST_F(LedgerWriter, AReportThatEndsBeforeItIsCountedAsQueuedLeavesNoneWaiting) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    writer.Received(100, false, NOW_MS);
    writer.Ended(Outcome::Stored, NOW_MS);
    EXPECT_EQ(WaitingIn(Look().total), 0U);
    writer.Queued();
    EXPECT_TRUE(Look().balanced);
    EXPECT_EQ(Look().total[MOST_WAITING], 0U);
}

TEST_F(LedgerWriter, CountsWhatTheKernelDropped) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    writer.Dropped(0, NOW_MS);
    EXPECT_EQ(Look().lastMs[DROPPED_BY_KERNEL], 0U) << "none is no loss";
    writer.Dropped(17, NOW_MS);
    writer.Dropped(3, NOW_MS + 1);
    EXPECT_EQ(Look().total[DROPPED_BY_KERNEL], 20U);
    EXPECT_EQ(Look().lastMs[DROPPED_BY_KERNEL], static_cast<std::uint64_t>(NOW_MS + 1));
    EXPECT_TRUE(Look().balanced) << "what was never received is in no balance";
}

TEST_F(LedgerWriter, ARestartGoesOnCountingAndTheCountSinceTheStartBeginsAnew) {
    {
        Writer writer;
        ASSERT_TRUE(Open(writer));
        for (int i = 0; i < 5; ++i)
            TakeAndEnd(writer, Outcome::Stored);
    }
    Writer writer;
    ASSERT_TRUE(Open(writer, NOW_MS + 1000));
    TakeAndEnd(writer, Outcome::NotJson);
    const auto look = Look();
    EXPECT_EQ(look.total[RECEIVED], 6U);
    EXPECT_EQ(Of(look.total, Outcome::Stored), 5U);
    EXPECT_EQ(look.startedAtMs, NOW_MS + 1000);
    EXPECT_EQ(look.begunAtMs, NOW_MS);
    const auto sinceStart = SinceStart(look);
    EXPECT_EQ(sinceStart[RECEIVED], 1U);
    EXPECT_EQ(Of(sinceStart, Outcome::Stored), 0U);
    EXPECT_EQ(Of(sinceStart, Outcome::NotJson), 1U);
}

TEST_F(LedgerWriter, TheMostThatWaitedIsKeptForAllTimeAndForTheRunningProcess) {
    {
        Writer writer;
        ASSERT_TRUE(Open(writer));
        for (int i = 0; i < 5; ++i)
            Take(writer);
    }
    Writer writer;
    ASSERT_TRUE(Open(writer));
    Take(writer);
    EXPECT_EQ(Look().total[MOST_WAITING], 5U);
    EXPECT_EQ(SinceStart(Look())[MOST_WAITING], 1U);
}

TEST_F(LedgerWriter, WhatAProcessDidNotEndIsLostWhenItIsGoneAndCountedByTheNextOne) {
    {
        Writer writer;
        ASSERT_TRUE(Open(writer));
        TakeAndEnd(writer, Outcome::Stored);
        for (int i = 0; i < 3; ++i)
            Take(writer);
        writer.Received(100, false, NOW_MS); // a fourth report, which is not in the queue yet
        EXPECT_TRUE(Look().balanced);
        EXPECT_EQ(WaitingIn(Look().total), 3U);
    }
    for (const auto* when : {"while nothing runs", "and again"}) {
        EXPECT_FALSE(Look().counting) << when;
        EXPECT_EQ(Look().total[LOST_AT_ENDS], 4U) << when;
        EXPECT_EQ(Look().lastMs[LOST_AT_ENDS], static_cast<std::uint64_t>(NOW_MS)) << when;
        EXPECT_EQ(WaitingIn(Look().total), 0U) << when;
    }
    for (int start = 0; start < 2; ++start) {
        Writer writer;
        ASSERT_TRUE(Open(writer, NOW_MS + 5000));
        const auto look = Look();
        EXPECT_EQ(look.total[LOST_AT_ENDS], 4U) << "once, and not at each start";
        EXPECT_EQ(look.lastMs[LOST_AT_ENDS], static_cast<std::uint64_t>(NOW_MS + 5000));
        EXPECT_EQ(WaitingIn(look.total), 0U);
        EXPECT_TRUE(look.balanced);
        EXPECT_EQ(SinceStart(look)[LOST_AT_ENDS], 0U);
    }
}

TEST_F(LedgerWriter, KeepsAMarkEachTenSecondsAndOneEachSecond) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    for (std::int64_t ms = 250; ms <= 25'000; ms += 250) {
        TakeAndEnd(writer, Outcome::Stored, NOW_MS + ms);
        writer.Tick(NOW_MS + ms);
    }
    const auto look = LookAt(writer.Content(), true, NOW_MS + 25'000);
    ASSERT_EQ(look.marks.size(), 3U);
    for (std::size_t i = 0; i < look.marks.size(); ++i) {
        EXPECT_EQ(look.marks[i].atMs, NOW_MS + static_cast<std::int64_t>(i) * 10'000);
        EXPECT_EQ(look.marks[i].counts[RECEIVED], i * 40);
    }
    ASSERT_EQ(look.recent.size(), RECENT_MARKS);
    EXPECT_EQ(look.recent.back().atMs, NOW_MS + 25'000);
    EXPECT_EQ(look.recent.front().atMs, NOW_MS + 22'000);
}

TEST_F(LedgerWriter, KeepsTheNewestSixtyMarks) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    for (std::int64_t i = 1; i < 100; ++i)
        writer.Tick(NOW_MS + i * 10'000);
    const auto look = LookAt(writer.Content(), true, NOW_MS + 1'000'000);
    ASSERT_EQ(look.marks.size(), MARKS);
    EXPECT_EQ(look.marks.front().atMs, NOW_MS + 40 * 10'000);
    EXPECT_EQ(look.marks.back().atMs, NOW_MS + 99 * 10'000);
}

TEST_F(LedgerWriter, AClockThatIsSetBackBeginsTheMarksAnew) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    for (std::int64_t i = 1; i < 10; ++i)
        writer.Tick(NOW_MS + i * 10'000);
    writer.Tick(NOW_MS - 3'600'000);
    const auto look = LookAt(writer.Content(), true, NOW_MS - 3'600'000);
    ASSERT_EQ(look.marks.size(), 1U);
    EXPECT_EQ(look.marks.front().atMs, NOW_MS - 3'600'000);
}

TEST_F(LedgerWriter, NamesTheProcessThatCounts) {
    Writer writer;
    ASSERT_TRUE(writer.Open(Directory(), "1.2.3", std::string(200, 'b'), NOW_MS));
    const auto look = Look();
    EXPECT_EQ(look.process, ::getpid());
    EXPECT_EQ(look.startedAtMs, NOW_MS);
    EXPECT_EQ(look.programVersion, "1.2.3");
    EXPECT_EQ(look.buildId, std::string(63, 'b')) << "cut to its field";
}
