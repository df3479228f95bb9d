#include <csignal>
#include <filesystem>
#include <fstream>
#include <set>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/e2e/support/Service.h"
#include "tests/support/WaitUntil.h"

using ::testing::HasSubstr;
using ::testing::MatchesRegex;

// A segmentation fault on each of the program's threads, at rest and under load.

namespace {

using namespace std::chrono_literals;

/// From the fault to the end of the process: the second that is promised, and room for a busy test machine.
/// Less than the five seconds after which the handler's own deadline would end it.
constexpr auto DEADLINE = 4s;

/// What puts the service under load.
void SendReports(int count) {
    for (int i = 0; i < count; ++i)
        Service::Send(R"({"eventID":"B1","value":{"a":1}})");
}

class Crash : public ::testing::Test {
protected:
    Crash() {
        m_service.Install();
        m_service.Start();
        Service::Send(R"({"msgType":"updateOpenID","exdata":{"openID":"u1"}})");
        m_service.AwaitQuiet();
    }

    pid_t ReceivingThread() const { return m_service.LogLines("App/ReportServer:42 Recv").front().thread; }
    pid_t ConsumingThread() const {
        return m_service.LogLines("App/ReportServer:111 SetBaseInfo").back().thread;
    }

    /// The process ended with 0, and the crashed thread left its trace, and no other thread did.
    void ExpectATraceOf(pid_t thread) {
        ExpectATrace();
        for (const auto& signal : m_service.LogLines("App/MiniDump:240 OnStackCallBack"))
            EXPECT_EQ(signal.thread, thread);
    }

    /// The process ended with 0, and one of its threads left its trace.
    void ExpectATrace() {
        EXPECT_EQ(m_service.AwaitEnd(DEADLINE), 0);
        const auto signals = m_service.LogLines("App/MiniDump:240 OnStackCallBack");
        ASSERT_EQ(signals.size(), 1U);
        EXPECT_EQ(signals[0].level, "ERROR");
        EXPECT_EQ(signals[0].message, "Signal[11]");
        auto frames = m_service.LogLines("App/MiniDump:252 OnStackCallBack");
        // A sanitizer's backtrace stands before the C library's, and so does its frame.
        std::erase_if(frames,
                      [](const auto& frame) { return frame.message.find("san.so") != std::string::npos; });
        EXPECT_GE(frames.size(), 3U);
        EXPECT_THAT(frames.front().message, HasSubstr("OnStackCallBack"))
            << "innermost first, and with names";
        for (const auto& frame : frames) {
            EXPECT_EQ(frame.level, "ERROR");
            EXPECT_THAT(frame.message, MatchesRegex("\\[.+\\]"));
        }
    }

    Service m_service;
};

} // namespace

TEST_F(Crash, OfTheMainThreadIsTraced) {
    m_service.Signal(SIGSEGV, m_service.Process());
    ExpectATraceOf(m_service.Process());
}

TEST_F(Crash, OfTheReceivingThreadIsTraced) {
    const pid_t thread = ReceivingThread();
    m_service.Signal(SIGSEGV, thread);
    ExpectATraceOf(thread);
}

TEST_F(Crash, OfTheConsumingThreadIsTraced) {
    const pid_t thread = ConsumingThread();
    m_service.Signal(SIGSEGV, thread);
    ExpectATraceOf(thread);
}

TEST_F(Crash, UnderLoadIsTraced) {
    SendReports(2000);
    m_service.Signal(SIGSEGV);
    ExpectATrace(); // of the main thread, which the kernel prefers, or of one that was just then started
}

TEST_F(Crash, OfAThreadAtWorkEndsTheProcess) {
    // The fault may hit a thread while it holds the allocator's lock; then the trace is lost, but not the
    // end.
    int traced = 0;
    constexpr int CRASHES = 6;
    for (int i = 0; i < CRASHES; ++i) {
        const pid_t thread = i % 2 == 0 ? ReceivingThread() : ConsumingThread();
        SendReports(1000);
        m_service.Signal(SIGSEGV, thread);
        const auto end = m_service.AwaitEnd(2 * DEADLINE);
        EXPECT_TRUE(end == 0 || end == -SIGALRM) << end.value_or(999);
        traced += end == 0 ? 1 : 0;
        std::filesystem::remove(m_service.LogFile());
        m_service.Start();
        Service::Send(R"({"msgType":"updateOpenID","exdata":{"openID":"u1"}})");
        m_service.AwaitQuiet();
    }
    EXPECT_GE(traced, CRASHES / 2);
}

TEST_F(Crash, FreesTheInstanceLockAndThePort) {
    m_service.Signal(SIGSEGV);
    EXPECT_EQ(m_service.AwaitEnd(DEADLINE), 0);
    m_service.Start();
    Service::Send(R"({"eventID":"B1"})");
    m_service.AwaitQuiet();
    EXPECT_EQ(m_service.RowCount(), 1);
}

TEST_F(Crash, OfAnotherKindIsNotHandled) {
    m_service.Signal(SIGABRT);
    EXPECT_EQ(m_service.AwaitEnd(), -SIGABRT);
    EXPECT_TRUE(m_service.LogLines("App/MiniDump:240 OnStackCallBack").empty());
}
