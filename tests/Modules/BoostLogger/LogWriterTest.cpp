#include "Modules/BoostLogger/LogWriter.h"

#include <atomic>
#include <csignal>
#include <future>

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tests/Modules/BoostLogger/LogFiles.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/OtherUser.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/WaitUntil.h"

using BoostLogger::LogSettings;
using BoostLogger::LogWriter;
using namespace std::chrono_literals;

namespace {

/// The tests choose the time that they give to LogWriter::Append.
class TheLogWriter : public testing::Test {
protected:
    LogSettings Settings(std::int64_t maxFileBytes = 1000, std::int64_t maxTotalBytes = 10000) const {
        return {m_directory, "Report.log", "TEST", "APP", maxFileBytes, maxTotalBytes, true, false};
    }

    std::uintmax_t TotalBytes() const {
        std::uintmax_t total = 0;
        for (const auto& path : LogFilesOf(m_directory))
            total += std::filesystem::file_size(path);
        return total;
    }

    TemporaryDirectory m_temporary;
    const std::string m_directory = m_temporary.Path() + "/log";
    const std::string m_path = m_directory + "/Report.log";
    const LogWriter::TimePoint m_start = std::chrono::steady_clock::now();
};

/// A line of `size` bytes, its newline included.
std::string Line(std::size_t size, char letter = 'x') {
    return std::string(size - 1, letter) + "\n";
}

/// Keeps files of this process from growing beyond `bytes`, as a full disk does.
void LimitFileSize(rlim_t bytes) {
    rlimit limit{};
    getrlimit(RLIMIT_FSIZE, &limit);
    limit.rlim_cur = bytes;
    setrlimit(RLIMIT_FSIZE, &limit);
}

} // namespace

TEST_F(TheLogWriter, RotatesBeforeAFileWouldBecomeTooLarge) {
    LogWriter writer(Settings());
    ASSERT_FALSE(writer.Start());
    for (int i = 0; i < 25; ++i)
        writer.Append(Line(100), m_start);
    EXPECT_EQ(std::filesystem::file_size(m_directory + "/Report_1.log"), 1000U);
    EXPECT_EQ(std::filesystem::file_size(m_directory + "/Report_2.log"), 1000U);
    EXPECT_EQ(std::filesystem::file_size(m_path), 500U);
}

TEST_F(TheLogWriter, RotatesBeforeASizeAtWhichTheSystemWouldEndTheProcess) {
    ChildProcess child([this] {
        LimitFileSize(1050);
        LogWriter writer(Settings(100'000, 1'000'000));
        const bool started = !writer.Start();
        for (int i = 0; i < 25; ++i)
            writer.Append(Line(100), m_start);
        return started;
    });
    EXPECT_EQ(child.Wait(), 0);
    EXPECT_EQ(std::filesystem::file_size(m_directory + "/Report_1.log"), 1000U);
    EXPECT_EQ(std::filesystem::file_size(m_directory + "/Report_2.log"), 1000U);
    EXPECT_EQ(std::filesystem::file_size(m_path), 500U);
}

TEST_F(TheLogWriter, SeesWhatAnotherProcessWroteWhereTheSystemEndsTheProcessAtASize) {
    ChildProcess child([this] {
        LimitFileSize(1050);
        LogWriter writer(Settings(100'000, 1'000'000));
        LogWriter other(Settings(100'000, 1'000'000));
        const bool started = !writer.Start() && !other.Start();
        for (int i = 0; i < 10; ++i)
            other.Append(Line(100), m_start);
        writer.Append(Line(100), m_start);
        return started;
    });
    EXPECT_EQ(child.Wait(), 0);
    EXPECT_EQ(std::filesystem::file_size(m_directory + "/Report_1.log"), 1000U);
    EXPECT_EQ(std::filesystem::file_size(m_path), 100U);
}

TEST_F(TheLogWriter, LosesALineThatIsLargerThanTheSystemLetsAFileBecome) {
    ChildProcess child([this] {
        LimitFileSize(1050);
        LogWriter writer(Settings(100'000, 1'000'000));
        const bool started = !writer.Start();
        writer.Append(Line(1100), m_start);
        writer.Append(Line(100), m_start + 1s);
        return started;
    });
    EXPECT_EQ(child.Wait(), 0);
    const auto lines = ReadLog(m_directory);
    ASSERT_EQ(lines.size(), 2U);
    EXPECT_TRUE(
        lines[0].ends_with("1 records could not be written: cannot write to the file: File too large"))
        << lines[0];
    EXPECT_EQ(lines[1] + "\n", Line(100));
}

TEST_F(TheLogWriter, GivesALineThatIsTooLargeForAnyFileAFileOfItsOwn) {
    LogWriter writer(Settings());
    ASSERT_FALSE(writer.Start());
    for (const std::size_t size : {10, 5000, 20})
        writer.Append(Line(size), m_start);
    EXPECT_EQ(std::filesystem::file_size(m_directory + "/Report_1.log"), 10U);
    EXPECT_EQ(std::filesystem::file_size(m_directory + "/Report_2.log"), 5000U);
    EXPECT_EQ(std::filesystem::file_size(m_path), 20U);
}

TEST_F(TheLogWriter, KeepsAllFilesTogetherWithinTheCapAtAnyTime) {
    LogWriter writer(Settings(1000, 3500));
    ASSERT_FALSE(writer.Start());
    for (int i = 0; i < 200; ++i) {
        writer.Append(Line(130), m_start);
        ASSERT_LE(TotalBytes(), 3500U);
    }
    EXPECT_EQ(LogFilesOf(m_directory).size(), 3U);
    EXPECT_GE(TotalBytes(), 2 * 910U);
}

TEST_F(TheLogWriter, KeepsNoRotatedFileWhereTheCapLeavesRoomForTheLiveOneOnly) {
    LogWriter writer(Settings(1000, 1000));
    ASSERT_FALSE(writer.Start());
    for (int i = 0; i < 50; ++i)
        writer.Append(Line(100), m_start);
    EXPECT_EQ(LogFilesOf(m_directory).size(), 1U);
}

TEST_F(TheLogWriter, AppliesASmallerCapWhenItStarts) {
    std::filesystem::create_directory(m_directory);
    for (int number = 1; number <= 5; ++number)
        WriteFile(m_directory + "/Report_" + std::to_string(number) + ".log", Line(1000));
    LogWriter writer(Settings(1000, 3000));
    ASSERT_FALSE(writer.Start());
    EXPECT_FALSE(std::filesystem::exists(m_directory + "/Report_3.log"));
    EXPECT_TRUE(std::filesystem::exists(m_directory + "/Report_4.log"));
}

TEST_F(TheLogWriter, GoesOnWithTheLiveFileAndTheNumbersOfAnEarlierRun) {
    for (int run = 0; run < 3; ++run) {
        LogWriter writer(Settings());
        ASSERT_FALSE(writer.Start());
        for (int i = 0; i < 7; ++i)
            writer.Append(Line(100), m_start);
    }
    EXPECT_EQ(LogFilesOf(m_directory).size(), 3U);
    EXPECT_TRUE(std::filesystem::exists(m_directory + "/Report_2.log"));
    EXPECT_EQ(std::filesystem::file_size(m_path), 100U);
}

TEST_F(TheLogWriter, DoesNotRotateAFileThatAnotherProcessHasRotatedAlready) {
    LogWriter one(Settings());
    LogWriter other(Settings());
    ASSERT_FALSE(one.Start());
    ASSERT_FALSE(other.Start());
    for (int i = 0; i < 10; ++i)
        one.Append(Line(100, 'a'), m_start);
    other.Append(Line(50, 'b'), m_start); // sees that the file is full, and rotates it
    one.Append(Line(50, 'a'), m_start);   // opens the new file
    EXPECT_EQ(LogFilesOf(m_directory).size(), 2U);
    EXPECT_EQ(ContentOf(m_path), Line(50, 'b') + Line(50, 'a'));
}

TEST_F(TheLogWriter, DoesNotRotateAFileThatSomebodyHasEmptied) {
    LogWriter writer(Settings());
    ASSERT_FALSE(writer.Start());
    for (int i = 0; i < 10; ++i)
        writer.Append(Line(100), m_start);
    std::filesystem::resize_file(m_path, 0);
    writer.Append("next\n", m_start);
    EXPECT_EQ(ContentOf(m_path), "next\n");
    EXPECT_FALSE(std::filesystem::exists(m_directory + "/Report_1.log"));
}

TEST_F(TheLogWriter, FollowsAPathThatBecameAnotherFileWithinATenthOfASecond) {
    LogWriter writer(Settings());
    ASSERT_FALSE(writer.Start());
    writer.Append("one\n", m_start);
    std::filesystem::rename(m_path, m_path + ".away");
    writer.Append("two\n", m_start + 99ms);
    EXPECT_EQ(ContentOf(m_path + ".away"), "one\ntwo\n");
    writer.Append("three\n", m_start + 100ms);
    EXPECT_EQ(ContentOf(m_path), "three\n");
}

TEST_F(TheLogWriter, MakesADeletedDirectoryAgain) {
    LogWriter writer(Settings());
    ASSERT_FALSE(writer.Start());
    writer.Append("one\n", m_start);
    std::filesystem::remove_all(m_directory);
    writer.Append("two\n", m_start + 1s);
    EXPECT_EQ(ContentOf(m_path), "two\n");
    EXPECT_EQ(ModeOf(m_directory), 0700U);
    EXPECT_EQ(ModeOf(m_path), 0600U);
}

TEST_F(TheLogWriter, CountsWhatItCannotWriteAndTellsWhenItRecovers) {
    LogWriter writer(Settings());
    ASSERT_FALSE(writer.Start());
    writer.Append("one\n", m_start);
    std::filesystem::remove_all(m_directory);
    WriteFile(m_directory, "in the way");
    writer.Append("two\n", m_start + 1s);
    writer.Append("three\n", m_start + 1001ms);
    std::filesystem::remove(m_directory);
    writer.Append("four\n", m_start + 1249ms); // too early for the next attempt
    EXPECT_FALSE(std::filesystem::exists(m_directory));
    writer.Append("five\n", m_start + 1250ms);
    writer.Append("six\n", m_start + 1251ms);

    const auto lines = ReadLines(m_path);
    ASSERT_EQ(lines.size(), 3U);
    EXPECT_NE(lines[0].find(" WARN  ["), std::string::npos);
    EXPECT_TRUE(lines[0].ends_with(
        "ReportLoss] 3 records could not be written: cannot make the directory: Not a directory"))
        << lines[0];
    EXPECT_EQ(lines[1], "five");
    EXPECT_EQ(lines[2], "six");
}

TEST_F(TheLogWriter, CountsARecordThatNeverBecameALine) {
    LogWriter writer(Settings());
    ASSERT_FALSE(writer.Start());
    writer.CountLost();
    writer.Append("one\n", m_start);
    const auto lines = ReadLines(m_path);
    ASSERT_EQ(lines.size(), 2U);
    EXPECT_TRUE(lines[0].ends_with("1 records could not be written: out of memory, or logged by a signal "
                                   "handler inside the logger"))
        << lines[0];
}

TEST_F(TheLogWriter, DoesNotGlueALineToTheHalfOfOneThatAFullDiskCutOff) {
    ChildProcess child([&] {
        std::signal(SIGXFSZ, SIG_IGN);
        LogWriter writer(Settings());
        if (writer.Start())
            return false;
        writer.Append(Line(100, 'a'), m_start);
        LimitFileSize(150);
        writer.Append(Line(100, 'b'), m_start + 1s); // only fifty bytes of it fit
        writer.Append(Line(100, 'c'), m_start + 2s); // no byte of it fits
        LimitFileSize(RLIM_INFINITY);
        writer.Append(Line(100, 'd'), m_start + 3s);
        return true;
    });
    ASSERT_EQ(child.Wait(), 0);
    const auto lines = ReadLines(m_path);
    ASSERT_EQ(lines.size(), 4U);
    EXPECT_EQ(lines[0], std::string(99, 'a'));
    EXPECT_EQ(lines[1], std::string(50, 'b'));
    EXPECT_TRUE(
        lines[2].ends_with("2 records could not be written: cannot write to the file: File too large"))
        << lines[2];
    EXPECT_EQ(lines[3], std::string(99, 'd'));
}

TEST_F(TheLogWriter, DropsRecordsRatherThanOutgrowItsFileWhereItMayNotRotate) {
    ChildProcess child([&] {
        if (!OtherUser::BecomeOwnerOf(m_temporary.Path()))
            return false;
        LogWriter writer(Settings());
        if (writer.Start())
            return false;
        chmod(m_directory.c_str(), 0500);
        for (int i = 0; i < 30; ++i)
            writer.Append(Line(100), m_start);
        const bool held = std::filesystem::file_size(m_path) == 1000;
        chmod(m_directory.c_str(), 0700);
        writer.Append("healed\n", m_start + 1s);
        return held;
    });
    ASSERT_EQ(child.Wait(), 0);
    const auto lines = ReadLines(m_path);
    ASSERT_EQ(lines.size(), 2U);
    EXPECT_TRUE(
        lines[0].ends_with("20 records could not be written: cannot rotate the file: Permission denied"))
        << lines[0];
    EXPECT_EQ(lines[1], "healed");
    EXPECT_EQ(std::filesystem::file_size(m_directory + "/Report_1.log"), 1000U);
}

TEST_F(TheLogWriter, DoesNotHangWhileAnotherProcessHoldsTheRotationLock) {
    LogWriter writer(Settings());
    ASSERT_FALSE(writer.Start());
    for (int i = 0; i < 10; ++i)
        writer.Append(Line(100), m_start);
    BoostLogger::LiveFile stopped;
    ASSERT_FALSE(stopped.Open(m_path));
    ASSERT_FALSE(stopped.Lock());
    for (int i = 0; i < 10000; ++i)
        writer.Append(Line(100), m_start); // the first line tries, and the other 9999 are dropped
    EXPECT_LT(std::chrono::steady_clock::now() - m_start, 5s);
    EXPECT_EQ(std::filesystem::file_size(m_path), 1000U);
    stopped.Close();
    writer.Append("healed\n", m_start + 1s);
    ASSERT_EQ(ReadLines(m_path).size(), 2U);
    EXPECT_NE(ReadLines(m_path)[0].find("10000 records could not be written: cannot lock the file"),
              std::string::npos);
}

#if !defined(__SANITIZE_THREAD__) // the thread sanitizer delays signals until a system call has returned
namespace {

LogWriter* g_interrupted = nullptr;

void LogFromTheHandler(int) {
    g_interrupted->Append("from the handler\n", std::chrono::steady_clock::now());
}

} // namespace

TEST_F(TheLogWriter, LosesARecordOfASignalHandlerRatherThanWaitForTheThreadThatItInterrupted) {
    ChildProcess child([&] {
        LogWriter writer(Settings());
        if (writer.Start())
            return false;
        g_interrupted = &writer;
        std::signal(SIGXFSZ, LogFromTheHandler); // this signal comes in the middle of the write
        LimitFileSize(0);
        writer.Append("one\n", m_start);
        LimitFileSize(RLIM_INFINITY);
        writer.Append("two\n", m_start + 1s);
        return true;
    });
    ASSERT_TRUE(WaitUntil([&] { return child.HasEnded(); }));
    EXPECT_EQ(child.Status(), 0);
    ASSERT_EQ(ReadLines(m_path).size(), 2U);
    EXPECT_NE(ReadLines(m_path)[0].find("2 records could not be written"), std::string::npos);
}
#endif

TEST_F(TheLogWriter, SaysWhyItCannotStart) {
    WriteFile(m_directory, "in the way");
    EXPECT_EQ(LogWriter(Settings()).Start().Text(), "cannot make the directory: Not a directory");
}

namespace {

/// Appends `count` lines of a hundred bytes that may wait, all at `now`.
void AppendBurst(LogWriter& writer, int count, LogWriter::TimePoint now) {
    for (int i = 0; i < count; ++i)
        writer.Append(Line(100), now, LogWriter::Haste::MayWait);
}

} // namespace

TEST_F(TheLogWriter, WritesTheFirstSixteenLinesOfAMillisecondAtOnce) {
    LogWriter writer(Settings(100'000, 1'000'000));
    ASSERT_FALSE(writer.Start());
    for (int line = 1; line <= 16; ++line) {
        AppendBurst(writer, 1, m_start);
        ASSERT_EQ(std::filesystem::file_size(m_path), 100U * static_cast<unsigned>(line));
    }
    AppendBurst(writer, 16, m_start + 1ms);
    EXPECT_EQ(std::filesystem::file_size(m_path), 3200U) << "another millisecond";
}

TEST_F(TheLogWriter, LetsSixteenLinesOfABurstShareAWrite) {
    const auto never = m_start + 1h; // so that the thread does not write them
    LogWriter writer(Settings(100'000, 1'000'000));
    ASSERT_FALSE(writer.Start());
    AppendBurst(writer, 16 + 15, never);
    EXPECT_EQ(std::filesystem::file_size(m_path), 1600U);
    AppendBurst(writer, 1, never);
    EXPECT_EQ(std::filesystem::file_size(m_path), 3200U);
}

TEST_F(TheLogWriter, WritesALineThatMayNotWaitAtOnceBehindThoseThatDid) {
    LogWriter writer(Settings(100'000, 1'000'000));
    ASSERT_FALSE(writer.Start());
    AppendBurst(writer, 16 + 5, m_start + 1h);
    writer.Append("urgent\n", m_start + 1h);
    const auto lines = ReadLines(m_path);
    ASSERT_EQ(lines.size(), 22U);
    EXPECT_EQ(lines.back(), "urgent");
}

TEST_F(TheLogWriter, WritesWaitingLinesWithoutAFurtherLine) {
    LogWriter writer(Settings(100'000, 1'000'000));
    ASSERT_FALSE(writer.Start());
    for (int round = 1; round <= 3; ++round) { // the thread wakes again, too
        AppendBurst(writer, 16 + 5, std::chrono::steady_clock::now());
        ASSERT_TRUE(WaitUntil(
            [&] { return std::filesystem::file_size(m_path) == 2100U * static_cast<unsigned>(round); }));
    }
}

TEST_F(TheLogWriter, WritesWhatWaitsWhenTheProcessEndsAndLetsNothingWaitAfterThat) {
    LogWriter writer(Settings(100'000, 1'000'000));
    ASSERT_FALSE(writer.Start());
    AppendBurst(writer, 16 + 5, m_start + 1h);
    writer.Finish();
    EXPECT_EQ(std::filesystem::file_size(m_path), 2100U);
    AppendBurst(writer, 30, m_start + 1h);
    EXPECT_EQ(std::filesystem::file_size(m_path), 5100U);
}

TEST_F(TheLogWriter, LeavesWaitingLinesToTheParentOfAFork) {
    LogWriter writer(Settings(100'000, 1'000'000));
    ASSERT_FALSE(writer.Start());
    AppendBurst(writer, 16 + 5, m_start + 1h);
    ChildProcess child([&] {
        AppendBurst(writer, 3, m_start + 1h);
        writer.Finish();
        return true;
    });
    ASSERT_EQ(child.Wait(), 0);
    EXPECT_EQ(std::filesystem::file_size(m_path), 1900U) << "the child's own lines, and at once";
    writer.Finish();
    EXPECT_EQ(std::filesystem::file_size(m_path), 2400U);
}

TEST_F(TheLogWriter, DoesNotHoldUpAChildThatBeganWhileAnotherThreadWrote) {
    LogWriter writer(Settings(100'000, 1'000'000));
    ASSERT_FALSE(writer.Start());
    std::atomic<bool> isToEnd = false;
    auto busy = std::async(std::launch::async, [&] {
        while (!isToEnd)
            writer.Append(Line(100), std::chrono::steady_clock::now());
    });
    for (int fork = 0; fork < 20; ++fork) {
        ChildProcess child([&] {
            AppendBurst(writer, 1, std::chrono::steady_clock::now());
            return true;
        });
        EXPECT_EQ(child.WaitFor(10s), 0);
    }
    isToEnd = true;
}

TEST_F(TheLogWriter, RotatesInABurstWhereItRotatesOtherwise) {
    LogWriter writer(Settings());
    ASSERT_FALSE(writer.Start());
    AppendBurst(writer, 25, m_start + 1h);
    writer.Finish();
    EXPECT_EQ(std::filesystem::file_size(m_directory + "/Report_1.log"), 1000U);
    EXPECT_EQ(std::filesystem::file_size(m_directory + "/Report_2.log"), 1000U);
    EXPECT_EQ(std::filesystem::file_size(m_path), 500U);
}

TEST_F(TheLogWriter, CountsTheLinesOfASharedWriteThatAFullDiskCutsOff) {
    ChildProcess child([this] {
        LogWriter writer(Settings(100'000, 1'000'000));
        if (writer.Start())
            return false;
        std::signal(SIGXFSZ, SIG_IGN);
        AppendBurst(writer, 16 + 10, m_start + 1h);
        LimitFileSize(1650 + 200); // two of the ten, and half of a third
        writer.Finish();
        LimitFileSize(RLIM_INFINITY);
        writer.Append("after\n", m_start + 2h);
        return true;
    });
    ASSERT_EQ(child.Wait(), 0);
    const auto lines = ReadLines(m_path);
    ASSERT_EQ(lines.size(), 21U);
    EXPECT_EQ(lines[17], Line(100).substr(0, 99));
    EXPECT_EQ(lines[18], Line(51).substr(0, 50));
    EXPECT_NE(lines[19].find("8 records could not be written: cannot write a whole line to the file"),
              std::string::npos)
        << lines[19];
    EXPECT_EQ(lines[20], "after");
}
