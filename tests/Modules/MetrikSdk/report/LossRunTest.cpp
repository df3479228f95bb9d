#include "Modules/MetrikSdk/report/LossRun.h"

#include <gtest/gtest.h>

using namespace MetrikSdk;
using namespace std::chrono_literals;

namespace {

const SteadyTime START{1000h};
const WallTime NOON{1'763'812'800s}; // 2025-11-22T12:00:00Z

TEST(LossRun, TellsHowManyFromWhenToWhenAndWhose) {
    report::LossRun run(10min);
    EXPECT_TRUE(run.Add("A759", 1000, START, NOON));
    EXPECT_FALSE(run.Add("B7", 3, START + 5min, NOON + 5min));
    EXPECT_FALSE(run.Add("A759", 200, START + 11min, NOON + 11min));
    EXPECT_EQ(run.TakeEnded(START + 21min), std::nullopt) << "it may go on";
    EXPECT_EQ(run.TakeEnded(START + 21min + 1ms),
              "1203 events from 2025-11-22T12:00:00Z to 2025-11-22T12:11:00Z: A759 1200, B7 3");
    EXPECT_EQ(run.TakeEnded(START + 60min), std::nullopt) << "told once";
    EXPECT_TRUE(run.Add("A759", 1, START + 61min, NOON)) << "another run";
}

TEST(LossRun, NamesABoundedNumberOfModules) {
    report::LossRun run(10min);
    for (int i = 0; i < 1000; ++i)
        run.Add("M" + std::to_string(i), 1, START, NOON);
    const auto text = run.Take().value();
    EXPECT_TRUE(text.starts_with("1000 events ")) << text;
    EXPECT_TRUE(text.ends_with(" other modules 980")) << text;
}

TEST(LossRun, HasNothingToTellWithoutALoss) {
    EXPECT_EQ(report::LossRun(0ms).Take(), std::nullopt);
}

} // namespace
