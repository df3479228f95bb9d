#include "Modules/MetrikSdk/report/FailureReporter.h"

#include <gtest/gtest.h>

using MetrikSdk::SteadyTime;
using MetrikSdk::report::Cause;
using MetrikSdk::report::FailureReporter;
using namespace std::chrono_literals;

namespace {

const SteadyTime START{1000h};

TEST(FailureReporter, TellsTheFirstFailureAtOnce) {
    FailureReporter reporter(1min);
    EXPECT_EQ(reporter.RecordFailure(Cause::Upload, "no route", START), "no route");
}

TEST(FailureReporter, TellsTheSameCauseOnceAMinuteWithTheNumberKeptBack) {
    FailureReporter reporter(1min);
    reporter.RecordFailure(Cause::Upload, "no route", START);
    for (int i = 0; i < 9'999; ++i)
        EXPECT_EQ(reporter.RecordFailure(Cause::Upload, "no route", START + 59s), std::nullopt);
    EXPECT_EQ(reporter.RecordFailure(Cause::Upload, "no route", START + 60s),
              "no route (and 9999 more of this kind since the last time)");
    EXPECT_EQ(reporter.RecordFailure(Cause::Upload, "no route", START + 61s), std::nullopt);
}

TEST(FailureReporter, TellsTheEndOnceForEachFailureThatItTold) {
    FailureReporter reporter(1min);
    EXPECT_FALSE(reporter.ReportEnd(Cause::Upload));
    reporter.RecordFailure(Cause::Upload, "no route", START);
    EXPECT_FALSE(reporter.ReportEnd(Cause::File));
    EXPECT_TRUE(reporter.ReportEnd(Cause::Upload));
    EXPECT_FALSE(reporter.ReportEnd(Cause::Upload));
    reporter.RecordFailure(Cause::Upload, "no route", START + 1s);
    EXPECT_FALSE(reporter.ReportEnd(Cause::Upload)) << "whose failure was kept back";
    EXPECT_EQ(reporter.RecordFailure(Cause::Upload, "no route", START + 60s),
              "no route (and 1 more of this kind since the last time)");
    EXPECT_TRUE(reporter.ReportEnd(Cause::Upload));
}

TEST(FailureReporter, TellsAnotherCauseWithoutRegardToTheFirst) {
    FailureReporter reporter(1min);
    reporter.RecordFailure(Cause::Upload, "no route", START);
    EXPECT_EQ(reporter.RecordFailure(Cause::File, "disk full", START), "disk full");
}

} // namespace
