#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Tools/reportctl/page/Gather.h"

namespace {

using reportctl::page::RefusedOverTime;
using ReportLedger::Outcome;

constexpr std::int64_t NOW_MS = 1'760'000'000'000;

ReportLedger::Counts Refused(std::uint64_t notJson) {
    ReportLedger::Counts counts{};
    counts[static_cast<unsigned>(Outcome::NotJson)] = notJson;
    return counts;
}

/// The counts of "notJson", the oldest first.
std::vector<std::uint64_t> CountsOf(const ReportLedger::Look& look) {
    std::vector<std::uint64_t> counts;
    for (const auto& refused : RefusedOverTime(look))
        counts.push_back(refused.byReason.front().second);
    return counts;
}

TEST(PagesRefusedReports, AreThoseFromMarkToMarkAndUntilNow) {
    ReportLedger::Look look;
    look.atMs = NOW_MS;
    look.marks = {{NOW_MS - 25'000, Refused(1)}, {NOW_MS - 15'000, Refused(4)}, {NOW_MS - 5'000, Refused(4)}};
    look.total = Refused(6);
    EXPECT_THAT(CountsOf(look), testing::ElementsAre(3, 0, 2));
    EXPECT_EQ(RefusedOverTime(look).back().atMs, NOW_MS);
}

TEST(PagesRefusedReports, AreThoseOfTheLastTenMinutes) {
    ReportLedger::Look look;
    look.atMs = NOW_MS;
    look.marks = {{NOW_MS - 800'000, Refused(1)}, {NOW_MS - 700'000, Refused(4)}};
    look.total = Refused(4);
    EXPECT_THAT(CountsOf(look), testing::ElementsAre(0)) << "the service has not run since";
}

TEST(PagesRefusedReports, AreNoneWithoutALedger) {
    EXPECT_THAT(CountsOf({}), testing::IsEmpty());
}

} // namespace
