#include <fstream>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Tools/reportctl/status/Parts.h"
#include "Tools/reportctl/terminal/WrittenTime.h"
#include "tests/support/TemporaryDirectory.h"

using namespace reportctl::status;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

// What status reads from the log.

namespace {

constexpr std::int64_t NOW_MS = 1'760'000'000'000;

class StatusLog : public ::testing::Test {
protected:
    void Write(const std::string& level, const std::string& text, std::int64_t atMs = NOW_MS,
               const std::string& process = "4711",
               const std::string& site = "Metrik/MetrikWorker:21 FailCallBackFun") {
        std::ofstream(m_directory.Path() + "/Report.log", std::ios::app) << fmt::format(
            "{} {:<5} [{}:4712] [{}] {}\n", reportctl::terminal::LocalTime(reportctl::terminal::At(atMs)),
            level, process, site, text);
    }

    Log Look() const { return LookAtLog(m_directory.Path(), {"4711", NOW_MS - 60'000}, NOW_MS); }

    std::vector<std::string> TextsFromOutbox() const {
        std::vector<std::string> texts;
        for (const auto& line : Look().fromOutbox)
            texts.push_back(line.text);
        return texts;
    }

    const TemporaryDirectory m_directory;
};

} // namespace

TEST_F(StatusLog, HasTheOutboxsLinesOfTheRunningProcessOnly) {
    Write("ERROR", "upload-an earlier process", NOW_MS, "17");
    Write("ERROR", "upload-a process of an earlier day with the same id", NOW_MS - 61'000);
    EXPECT_THAT(TextsFromOutbox(), IsEmpty());
    Write("ERROR", "upload-from elsewhere", NOW_MS, "4711", "App/ReportServer:1 Recv");
    EXPECT_THAT(TextsFromOutbox(), IsEmpty());
    Write("ERROR", "upload-this one");
    EXPECT_THAT(TextsFromOutbox(), ElementsAre("upload-this one"));
}

TEST_F(StatusLog, CountsNoLineOfTheTimeBeforeTheClockWasSetBack) {
    Write("ERROR", "old", NOW_MS + 3'600'000);
    Write("WARN", "older", NOW_MS - 601'000);
    EXPECT_EQ(Look().errors, 0);
    EXPECT_EQ(Look().warnings, 0);
    Write("ERROR", "new", NOW_MS - 599'000);
    EXPECT_EQ(Look().errors, 1);
}

TEST_F(StatusLog, LeavesOtherTextsInSightDuringAStormOfOne) {
    Write("WARN", "the first");
    Write("WARN", "the second");
    for (int i = 0; i < 100; ++i)
        Write("ERROR", "the storm");
    Write("WARN", "the first");
    const auto log = Look();
    std::vector<std::string> seen;
    for (const auto& [line, times] : log.lastTexts)
        seen.push_back(fmt::format("{}x {}", times, line.text));
    EXPECT_THAT(seen, ElementsAre("1x the second", "100x the storm", "2x the first"));
    EXPECT_EQ(log.last.size(), 5U);
}

TEST_F(StatusLog, ShowsTheLastFiveTextsWithAllTheirTimes) {
    for (int i = 0; i < 7; ++i)
        Write("ERROR", fmt::format("text {}", i));
    Write("ERROR", "text 0");
    const auto log = Look();
    ASSERT_EQ(log.lastTexts.size(), 5U);
    EXPECT_EQ(log.lastTexts.back().line.text, "text 0");
    EXPECT_EQ(log.lastTexts.back().times, 2);
    EXPECT_EQ(log.lastTexts.front().line.text, "text 3");
}
