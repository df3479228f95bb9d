#include "Modules/BoostLogger/RecordLine.h"

#include <cstdlib>
#include <ctime>
#include <string>
#include <thread>

#include <gtest/gtest.h>
#include <unistd.h>

#include "SystemTool/Platform.h"
#include "tests/support/ChildProcess.h"

using BoostLogger::LogRecord;
using namespace std::chrono_literals;

namespace {

using Time = std::chrono::system_clock::time_point;

std::string LineOf(const LogRecord& record, Time now) {
    BoostLogger::LineBuffer line;
    BoostLogger::ComposeLine(line, record, now);
    return std::string(BoostLogger::TextOf(line));
}

/// "[pid:tid]" of the calling thread.
std::string ThisThread() {
    return "[" + std::to_string(getpid()) + ":" + std::to_string(SystemTool::Platform::CurrentThreadId()) +
           "]";
}

class RecordLine : public testing::Test {
protected:
    RecordLine() {
        setenv("TZ", "UTC-8", 1); // eight hours east of UTC: POSIX reverses the sign
        tzset();
    }

    const Time m_time = Time{} + 1795140930123ms; // 2026-11-20 02:15:30.123 UTC
    LogRecord m_record{2, "", "App/ReportServer", "Recv", 42, "message"};
};

} // namespace

TEST_F(RecordLine, HasExactlyThisForm) {
    EXPECT_EQ(LineOf(m_record, m_time),
              "2026-11-20 10:15:30.123 INFO  " + ThisThread() + " [App/ReportServer:42 Recv] message\n");
}

TEST_F(RecordLine, NamesTheFiveLevelsInFiveCharacters) {
    const char* const words[] = {"DEBUG", "INFO ", "WARN ", "ERROR", "FATAL"};
    for (int level = 1; level <= 5; ++level) {
        m_record.level = level;
        EXPECT_EQ(LineOf(m_record, m_time).substr(23, 7), std::string(" ") + words[level - 1] + " ");
    }
}

TEST_F(RecordLine, ShowsAnotherLevelAsItsNumber) {
    for (const auto& [level, text] :
         {std::pair{0, " 0     ["}, {6, " 6     ["}, {-1, " -1    ["}, {1234567, " 1234567 ["}}) {
        m_record.level = level;
        EXPECT_EQ(LineOf(m_record, m_time).substr(23, std::string(text).size()), text);
    }
}

TEST_F(RecordLine, ShowsATagAfterTheFunction) {
    m_record.tag = "net";
    EXPECT_NE(LineOf(m_record, m_time).find(" [App/ReportServer:42 Recv #net] message\n"), std::string::npos);
}

TEST_F(RecordLine, EscapesEveryText) {
    const LogRecord record{2, "t\n", "f\n", "g\n", 1, "m\n"};
    EXPECT_NE(LineOf(record, m_time).find(" [f\\n:1 g\\n #t\\n] m\\n\n"), std::string::npos);
}

TEST_F(RecordLine, FollowsTheClockForwardAndBack) {
    EXPECT_EQ(LineOf(m_record, m_time).substr(0, 23), "2026-11-20 10:15:30.123");
    EXPECT_EQ(LineOf(m_record, m_time + 876ms).substr(0, 23), "2026-11-20 10:15:30.999");
    EXPECT_EQ(LineOf(m_record, m_time + 877ms).substr(0, 23), "2026-11-20 10:15:31.000");
    EXPECT_EQ(LineOf(m_record, m_time - 1h).substr(0, 23), "2026-11-20 09:15:30.123");
    EXPECT_EQ(LineOf(m_record, Time{} - 8h - 1ms).substr(0, 23), "1969-12-31 23:59:59.999");
}

TEST_F(RecordLine, NamesTheThreadThatLogs) {
    const std::string here = LineOf(m_record, m_time);
    std::string there;
    std::string thread;
    std::thread([&] {
        there = LineOf(m_record, m_time);
        thread = ThisThread();
    }).join();
    EXPECT_NE(here.find(ThisThread()), std::string::npos);
    EXPECT_NE(there.find(thread), std::string::npos);
    EXPECT_NE(thread, ThisThread());
}

TEST_F(RecordLine, NamesTheNewProcessAfterAFork) {
    LineOf(m_record, m_time);
    ChildProcess child([&] { return LineOf(m_record, m_time).find(ThisThread()) != std::string::npos; });
    EXPECT_EQ(child.Wait(), 0);
}

TEST_F(RecordLine, CutsALongMessageAndSaysHowLongItWas) {
    const std::string longest(64 * 1024, 'a');
    m_record.message = longest;
    EXPECT_NE(LineOf(m_record, m_time).find("] " + longest + "\n"), std::string::npos);
    const std::string longer = longest + "bc";
    m_record.message = longer;
    EXPECT_NE(LineOf(m_record, m_time).find("] " + longest + "... [cut, the message had 65538 bytes]\n"),
              std::string::npos);
}

TEST_F(RecordLine, CutsBetweenCharacters) {
    const std::string text = std::string(64 * 1024 - 1, 'a') + "\u62a5";
    m_record.message = text;
    EXPECT_NE(LineOf(m_record, m_time).find("aaa... [cut, the message had 65538 bytes]\n"),
              std::string::npos);
}
