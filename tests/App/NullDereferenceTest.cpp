#include <csignal>

#include <Poco/Net/DatagramSocket.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <unistd.h>

#include "App/MiniDump.h"
#include "App/ReportServer.h"
#include "tests/fakes/FakeLogger.h"

using namespace SyncServiceReport;
using ::testing::ExitedWithCode;

// A mistake in the program, on each of its threads. Unlike a signal that was sent, its fault comes again if
// the handler returns.

namespace {

[[gnu::noinline, gnu::no_sanitize("undefined")]] void WriteToNull() {
    volatile int* volatile nowhere = nullptr;
    *nowhere = 1; // NOLINT(clang-analyzer-core.NullDereference): what is asked for
}

/// Has the thread that logs a record of `function` make the mistake then. A record of the trace that comes
/// from the same thread is followed by a line that says so.
void MakeTheMistakeIn(const std::string& function) {
    FakeLogger().echoes = true;
    FakeLogger().onWrite = [function](const LogRecord& record) {
        thread_local bool isTheOne = false;
        if (record.function == "OnStackCallBack")
            std::cerr << (isTheOne ? "by the one" : "by another") << std::endl;
        if (record.function != function)
            return;
        isTheOne = true;
        WriteToNull();
    };
}

void SendDatagram(const std::string& text) {
    Poco::Net::DatagramSocket sender(Poco::Net::SocketAddress("127.0.0.1", 0));
    sender.sendTo(text.data(), static_cast<int>(text.size()), Poco::Net::SocketAddress("127.0.0.1", 9997));
}

/// The service, which makes the mistake where `function` logs, at the latest when a message has arrived.
void RunWithTheMistakeIn(const std::string& function) {
    const rlimit seconds{.rlim_cur = 20, .rlim_max = 20}; // a handler that returned would go on for ever
    ::setrlimit(RLIMIT_CPU, &seconds);
    MiniDump::EnableAutoStack("/logs", "Report");
    MakeTheMistakeIn(function);
    ReportServer server;
    server.Start();
    SendDatagram(R"({"msgType":"updateOpenID","exdata":{"openID":"u1"}})");
    for (;;)
        ::pause();
}

#define TRACE_OF_THE_ONE                                                                                     \
    "4 \\[App/MiniDump:240 OnStackCallBack\\] tag= Signal\\[11\\] reserved=0\nby the one\n"                  \
    "(4 \\[App/MiniDump:252 OnStackCallBack\\] tag= \\[.+\\] reserved=0\nby the one\n)+$"

} // namespace

TEST(NullDereferenceDeathTest, OfTheMainThreadIsTracedOnce) {
    EXPECT_EXIT(RunWithTheMistakeIn("Init"), ExitedWithCode(0), TRACE_OF_THE_ONE) << "while it starts";
}

TEST(NullDereferenceDeathTest, OfTheReceivingThreadIsTracedOnce) {
    EXPECT_EXIT(RunWithTheMistakeIn("Recv"), ExitedWithCode(0), TRACE_OF_THE_ONE);
}

TEST(NullDereferenceDeathTest, OfTheConsumingThreadIsTracedOnce) {
    EXPECT_EXIT(RunWithTheMistakeIn("SetBaseInfo"), ExitedWithCode(0), TRACE_OF_THE_ONE);
}
