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

// A programming mistake on each of the program's threads. Unlike a signal that was sent, such a fault comes
// again when the handler returns.

namespace {

[[gnu::noinline, gnu::no_sanitize("undefined")]] void WriteToNull() {
    volatile int* volatile nowhere = nullptr;
    *nowhere = 1; // NOLINT(clang-analyzer-core.NullDereference): what is asked for
}

/// Makes the thread crash that logs a record of `function`. When the same thread also logs the trace, each
/// record of the trace is followed by the line "by the one".
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

/// Runs the service, which crashes where `function` logs, at the latest when a message has arrived.
void RunWithTheMistakeIn(const std::string& function) {
    // If the handler returned, this would repeat for ever.
    const rlimit seconds{.rlim_cur = 20, .rlim_max = 20};
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
