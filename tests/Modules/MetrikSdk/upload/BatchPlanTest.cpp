#include "Modules/MetrikSdk/upload/BatchPlan.h"

#include <gtest/gtest.h>

using namespace MetrikSdk;
using namespace std::chrono_literals;

namespace {

const WallTime NOW{1'700'000'000s};

Batch Waiting(std::size_t count, std::size_t bytesEach, WallTime storedAt) {
    Batch batch;
    for (std::size_t i = 0; i < count; ++i) {
        StoredEvent event;
        event.bytes = bytesEach;
        event.storedAt = storedAt;
        batch.events.push_back(event);
    }
    return batch;
}

upload::BatchPlan Plan(const Batch& waiting) {
    BatchSettings settings;
    settings.maxEvents = 10;
    settings.maxBytes = 1000;
    settings.linger = 1s;
    const auto head = upload::HeadOf(waiting, settings.maxEvents, settings);
    return upload::PlanBatch(head, settings.maxEvents, NOW, settings);
}

TEST(BatchPlan, HasNothingToSendFromAnEmptyOutbox) {
    EXPECT_EQ(Plan({}).count, 0U);
}

TEST(BatchPlan, SendsAFullCountAtOnce) {
    const auto plan = Plan(Waiting(10, 1, NOW));
    EXPECT_EQ(plan.count, 10U);
    EXPECT_EQ(plan.wait, 0ms);
}

TEST(BatchPlan, SendsWhatFillsTheBytesAtOnce) {
    const auto plan = Plan(Waiting(3, 400, NOW));
    EXPECT_EQ(plan.count, 2U);
    EXPECT_EQ(plan.wait, 0ms);
}

TEST(BatchPlan, SendsOneEventHoweverLarge) {
    const auto plan = Plan(Waiting(2, 5000, NOW));
    EXPECT_EQ(plan.count, 1U);
    EXPECT_EQ(plan.wait, 0ms);
}

TEST(BatchPlan, WaitsForCompanyUntilTheOldestIsOldEnough) {
    EXPECT_EQ(Plan(Waiting(3, 1, NOW - 400ms)).wait, 600ms);
    EXPECT_EQ(Plan(Waiting(3, 1, NOW - 1s)).wait, 0ms);
    EXPECT_EQ(Plan(Waiting(3, 1, NOW - 1s)).count, 3U);
}

TEST(BatchPlan, DoesNotHoldEventsFromTheFuture) {
    EXPECT_EQ(Plan(Waiting(3, 1, NOW + 24h)).wait, 0ms);
    EXPECT_EQ(Plan(Waiting(3, 1, NOW + 2ms)).wait, 1002ms) << "stored while the plan was made";
}

TEST(BatchPlan, DoesNotHoldEventsOfAnImpossibleTime) {
    for (const auto time : {WallTime::min(), WallTime::max()})
        EXPECT_EQ(Plan(Waiting(3, 1, time)).wait, 0ms);
}

} // namespace
