#include "Tools/reportctl/forward/Schedule.h"

#include <gtest/gtest.h>

using namespace std::chrono_literals;
using reportctl::forward::Schedule;

namespace {

const Schedule::Time NOW{1h};

TEST(Schedule, BeginsWithBothAtOnce) {
    const Schedule schedule(true);
    EXPECT_TRUE(schedule.FiguresAreDue(NOW));
    EXPECT_TRUE(schedule.RowsAreDue(NOW));
    EXPECT_EQ(schedule.UntilDue(NOW), 0ms);
}

TEST(Schedule, LetsNeitherHoldBackTheOther) {
    Schedule schedule(true);
    schedule.RowsWait(NOW, 300s);
    schedule.FiguresWait(NOW, 60s);
    EXPECT_EQ(schedule.UntilDue(NOW), 60s);
    EXPECT_TRUE(schedule.FiguresAreDue(NOW + 60s));
    EXPECT_FALSE(schedule.RowsAreDue(NOW + 60s));
    schedule.FiguresWait(NOW + 60s, 900s);
    EXPECT_EQ(schedule.UntilDue(NOW + 60s), 240s);
    EXPECT_TRUE(schedule.RowsAreDue(NOW + 300s));
    EXPECT_FALSE(schedule.FiguresAreDue(NOW + 300s));
}

TEST(Schedule, NeverHasFiguresWhereNoneAreToBeSent) {
    Schedule schedule(false);
    EXPECT_FALSE(schedule.FiguresAreDue(NOW));
    schedule.RowsWait(NOW, 30s);
    EXPECT_EQ(schedule.UntilDue(NOW), 30s);
}

TEST(Schedule, WaitsNoShorterThanToWhatIsDue) {
    Schedule schedule(false);
    schedule.RowsWait(NOW, 1ms);
    EXPECT_EQ(schedule.UntilDue(NOW + 1us), 1ms);
}

} // namespace
