#include "Modules/MetrikSdk/outbox/Uuid.h"

#include <set>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using MetrikSdk::WallTime;
using MetrikSdk::outbox::NewUuid;

namespace {

const WallTime NOW{std::chrono::milliseconds(0x0123'4567'89ab)};

TEST(Uuid, HasTheFormVersionAndVariantOfVersionSeven) {
    for (int i = 0; i < 100; ++i)
        EXPECT_THAT(NewUuid(NOW),
                    testing::MatchesRegex("[0-9a-f]{8}-[0-9a-f]{4}-7[0-9a-f]{3}-[89ab][0-9a-f]{3}-"
                                          "[0-9a-f]{12}"));
}

TEST(Uuid, BeginsWithTheTime) {
    // Later than the time in any other test, so that no earlier test can have moved the last time beyond it.
    const WallTime late{std::chrono::milliseconds(0x0fff'4567'89ab)};
    EXPECT_EQ(NewUuid(late).substr(0, 13), "0fff4567-89ab");
}

TEST(Uuid, GrowsWithinAMillisecondAndWhenTheClockGoesBack) {
    std::string last = NewUuid(NOW);
    for (int i = 0; i < 10'000; ++i) {
        const auto next = NewUuid(NOW - std::chrono::milliseconds(i));
        ASSERT_LT(last, next);
        last = next;
    }
}

TEST(Uuid, IsUniqueAcrossThreads) {
    std::vector<std::vector<std::string>> made(4);
    std::vector<std::thread> threads;
    for (auto& list : made)
        threads.emplace_back([&list] {
            for (int i = 0; i < 2000; ++i)
                list.push_back(NewUuid(NOW));
        });
    for (auto& thread : threads)
        thread.join();
    std::set<std::string> all;
    for (const auto& list : made)
        all.insert(list.begin(), list.end());
    EXPECT_EQ(all.size(), 8000U);
}

} // namespace
