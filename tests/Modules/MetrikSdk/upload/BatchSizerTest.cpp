#include "Modules/MetrikSdk/upload/BatchSizer.h"

#include <algorithm>
#include <set>

#include <gtest/gtest.h>

using MetrikSdk::upload::BatchSizer;
using MetrikSdk::upload::Blame;
using MetrikSdk::upload::RequestSize;

namespace {

RequestSize Events(std::size_t count) {
    return {count, count * 1000};
}

/// Lets a sizer send `events` events, of which the `bad` ones are refused. Returns the number of requests.
int WorkOff(std::size_t events, const std::set<std::size_t>& bad, std::set<std::size_t>& found) {
    BatchSizer sizer(512);
    std::size_t next = 0;
    int requests = 0;
    while (next < events && requests < 10'000) {
        ++requests;
        const auto count = std::min(sizer.MaxEvents(), events - next);
        const auto firstBad = bad.lower_bound(next);
        if (firstBad == bad.end() || *firstBad >= next + count) {
            sizer.Taken(Events(count));
            next += count;
        } else if (sizer.Failed(Events(count), Blame::Event)) {
            found.insert(next++);
            sizer.Found();
        }
    }
    return requests;
}

TEST(BatchSizer, FindsTheOneBadEventOfABatchWhereverItIs) {
    for (std::size_t bad = 0; bad < 500; ++bad) {
        std::set<std::size_t> found;
        EXPECT_LE(WorkOff(500, {bad}, found), 20) << bad;
        EXPECT_EQ(found, std::set<std::size_t>{bad});
    }
}

TEST(BatchSizer, FindsEveryBadEvent) {
    const std::set<std::size_t> bad{0, 1, 250, 499};
    std::set<std::size_t> found;
    WorkOff(500, bad, found);
    EXPECT_EQ(found, bad);
}

TEST(BatchSizer, SendsFullBatchesAgainWhenTheRefusalWasAPassingOne) {
    BatchSizer sizer(512);
    EXPECT_FALSE(sizer.Failed(Events(500), Blame::Event));
    EXPECT_EQ(sizer.MaxEvents(), 250U);
    sizer.Taken(Events(250));
    EXPECT_EQ(sizer.MaxEvents(), 250U);
    sizer.Taken(Events(250));
    EXPECT_EQ(sizer.MaxEvents(), 512U);
}

/// Sends requests; one with more than `most` events fails without an answer. Returns how many failed.
int SendOverASlowLine(BatchSizer& sizer, std::size_t most, int requests) {
    int failures = 0;
    for (int i = 0; i < requests; ++i) {
        const auto count = sizer.MaxEvents();
        if (count <= most)
            sizer.Taken(Events(count));
        else if (++failures; sizer.Failed(Events(count), Blame::NoAnswer))
            break;
    }
    return failures;
}

TEST(BatchSizer, RemembersTheSizeThatWorked) {
    BatchSizer sizer(512);
    EXPECT_LE(SendOverASlowLine(sizer, 100, 20), 5);
    EXPECT_LE(sizer.MaxEvents(), 100U);
    EXPECT_GE(sizer.MaxEvents(), 50U);
    EXPECT_LE(SendOverASlowLine(sizer, 100, 200), 6) << "of 200 requests a few are experiments";
}

TEST(BatchSizer, GrowsBackToFullBatchesWhenTheLineIsFastAgain) {
    BatchSizer sizer(512);
    SendOverASlowLine(sizer, 100, 20);
    EXPECT_EQ(SendOverASlowLine(sizer, 512, 300), 0);
    EXPECT_EQ(sizer.MaxEvents(), 512U);
}

TEST(BatchSizer, HalvesAtTheSecondLaterAndNotAtTheFirst) {
    BatchSizer sizer(512);
    EXPECT_FALSE(sizer.Failed(Events(512), Blame::Later));
    EXPECT_EQ(sizer.MaxEvents(), 512U);
    EXPECT_FALSE(sizer.Failed(Events(512), Blame::Later));
    EXPECT_EQ(sizer.MaxEvents(), 256U);
    EXPECT_FALSE(sizer.Failed(Events(256), Blame::Later));
    EXPECT_EQ(sizer.MaxEvents(), 128U);
}

TEST(BatchSizer, SendsFullBatchesAgainOnceTheEventThatSteppedAsideProvesToBlame) {
    BatchSizer sizer(512);
    for (std::size_t count = 512; count > 1; count = sizer.MaxEvents())
        ASSERT_FALSE(sizer.Failed(Events(count), Blame::NoAnswer));
    EXPECT_TRUE(sizer.Failed(Events(1), Blame::NoAnswer));
    sizer.SteppedAside();
    EXPECT_EQ(sizer.MaxEvents(), 1U);
    sizer.Taken(Events(1));
    EXPECT_EQ(sizer.MaxEvents(), 512U);
}

TEST(BatchSizer, LearnsTheLongestBodyAndStaysBelowWhatWasRefused) {
    BatchSizer sizer(512);
    EXPECT_EQ(sizer.MaxBodyBytes(), BatchSizer::UNKNOWN);
    sizer.Failed({512, 4'000'000}, Blame::TooLarge);
    EXPECT_EQ(sizer.MaxBodyBytes(), 2'000'000U);
    for (int i = 0; i < 1000; ++i)
        sizer.Taken({256, sizer.MaxBodyBytes()});
    EXPECT_EQ(sizer.MaxBodyBytes(), 3'999'999U);
    EXPECT_EQ(sizer.MaxEvents(), 512U);
}

TEST(BatchSizer, LearnsNothingFromOneEventThatIsTooLarge) {
    BatchSizer sizer(512);
    EXPECT_TRUE(sizer.Failed({1, 4'000'000}, Blame::TooLarge));
    EXPECT_EQ(sizer.MaxBodyBytes(), BatchSizer::UNKNOWN);
}

} // namespace
