#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>

#include <Poco/Net/DatagramSocket.h>
#include <SQLiteCpp/SQLiteCpp.h>

#include "SystemTool/IO/Descriptor.h"
#include "tests/e2e/support/Disk.h"
#include "tests/e2e/support/StatusFixture.h"
#include "tests/support/WaitUntil.h"

using ::testing::HasSubstr;

// Each verdict by its cause, and back to healthy once the cause is gone.

namespace {

constexpr auto OUTBOX_SITE = "Metrik/MetrikWorker:21 FailCallBackFun";
constexpr auto EVENT = R"({"eventID":"A759|1"})";
constexpr auto NO_COLLECTOR = "OTEL_EXPORTER_OTLP_ENDPOINT=http://127.0.0.1:9";

class ServicesVerdict : public StatusFixture {
protected:
    /// Starts the service with a collector that cannot be reached, and waits until it has failed to send.
    void StartWithAFailingUpload() {
        m_service.SetEnvironment(NO_COLLECTOR);
        m_service.Start();
        Service::Send(EVENT);
        ASSERT_TRUE(WaitUntil([&] { return !m_service.LogLines(OUTBOX_SITE).empty(); }));
    }

    void StartAgainWithoutACollector() {
        m_service.Signal(SIGTERM);
        ASSERT_TRUE(m_service.AwaitEnd());
        m_service.SetEnvironment("OTEL_SDK_DISABLED=true");
        m_service.Start();
    }

    /// Changes a counter in the ledger's file while the service is idle.
    void Add(ReportLedger::Counter counter, std::int64_t count) const {
        const SystemTool::IO::Descriptor file(::open(m_service.LedgerFile().c_str(), O_RDWR | O_CLOEXEC));
        const auto at = static_cast<off_t>(offsetof(ReportLedger::File, total) + 8 * counter);
        std::int64_t value = 0;
        ASSERT_EQ(::pread(file.Number(), &value, sizeof value, at), 8);
        value += count;
        ASSERT_EQ(::pwrite(file.Number(), &value, sizeof value, at), 8);
    }
};

} // namespace

TEST_F(ServicesVerdict, IsDegradedByDropsWhileTheServiceHangsAndAfterwards) {
    m_service.Start();
    m_service.Signal(SIGSTOP);
    const std::string report(8000, 'x');
    ASSERT_TRUE(WaitUntil([&] {
        for (int i = 0; i < 100; ++i)
            Service::Send(report);
        return Service::DroppedByKernel() > 0;
    }));
    auto json = Json(1);
    EXPECT_THAT(m_text, HasSubstr("dropped by the kernel before the service could take them"));
    EXPECT_EQ(At(json, "ledger.sinceStart.droppedByKernel"), "0");
    m_service.Signal(SIGCONT);
    ASSERT_TRUE(WaitUntil([&] { return m_service.Counted(ReportLedger::DROPPED_BY_KERNEL) > 0; }));
    Expect(1, "dropped by the kernel before the service could take them");
}

TEST_F(ServicesVerdict, SaysWhatAKillLostBeforeAndAfterTheNextStart) {
    m_service.Start();
    m_service.AwaitQuiet();
    SQLite::Database other(m_service.DatabaseFile(), SQLite::OPEN_READWRITE, 10'000);
    other.exec("begin immediate"); // the store waits for this transaction
    for (int i = 0; i < 10; ++i)
        Service::Send(R"({"eventID":"B1"})");
    ASSERT_TRUE(WaitUntil([&] { return m_service.Counted(ReportLedger::QUEUED) == 11; }));
    m_service.Kill();
    other.exec("rollback");
    const auto lost = std::to_string(m_service.Counted(ReportLedger::LOST_AT_ENDS));
    Expect(2, lost + " reports were received and not handled when the service ended");
    m_service.Start();
    Expect(1, lost + " reports were received and not handled when the service ended");
}

TEST_F(ServicesVerdict, IsDegradedByReportsForMissingPlugins) {
    m_service.Remove("libOrvekSqlite.dylib");
    m_service.Remove("libMetrikSdk.dylib");
    m_service.Start();
    Service::Send(R"({"eventID":"B1"})");
    Service::Send(EVENT);
    ASSERT_TRUE(WaitUntil([&] { return ReportLedger::EndedIn(m_service.Books().total) == 2; }));
    Expect(1, "a report was refused because there is no store");
    EXPECT_THAT(m_text, HasSubstr("a report was refused by the analytics SDK, or for want of it"));
}

TEST_F(ServicesVerdict, IsDegradedByALittleDisk) {
    const Disk disk(m_service.DataDirectory(), 40'000'000);
    m_service.Install();
    m_service.Start();
    Json(0);
    disk.Fill();
    Expect(1, "Only 0 MB are free");
    disk.MakeRoom();
    Json(0);
    m_service.Kill(); // so that the disk can be taken away
}

TEST_F(ServicesVerdict, IsDegradedByALedgerThatDoesNotBalance) {
    m_service.Start();
    m_service.AwaitQuiet();
    Json(0);
    Add(ReportLedger::RECEIVED, 2);
    Expect(1, "2 reports are unaccounted for");
    Add(ReportLedger::RECEIVED, -2);
    Json(0);
}

TEST_F(ServicesVerdict, IsDegradedByAProgramThatSharesThePort) {
    m_service.Start();
    Json(0);
    const Poco::Net::DatagramSocket other(Poco::Net::SocketAddress::IPv4);
    other.impl()->setReusePort(true);
    Poco::Net::DatagramSocket(other).bind(Poco::Net::SocketAddress("127.0.0.1", 9997), false, true);
    Expect(1, "Port 9997 is shared with e2e_tests of user");
    Poco::Net::DatagramSocket(other).close();
    Json(0);
}

TEST_F(ServicesVerdict, IsDegradedByAFailingUploadUntilAServiceWithoutACollectorRuns) {
    ASSERT_NO_FATAL_FAILURE(StartWithAFailingUpload());
    Expect(1, "The outbox has a failure that lasts: upload-http://127.0.0.1:9");
    ASSERT_NO_FATAL_FAILURE(StartAgainWithoutACollector());
    EXPECT_EQ(At(Json(0), "outbox.lastFailure"), "null");
}

TEST_F(ServicesVerdict, IsDegradedByAFailingUploadThatTheLogHasLost) {
    ASSERT_NO_FATAL_FAILURE(StartWithAFailingUpload());
    std::filesystem::resize_file(m_service.LogFile(), 0); // as if other lines had taken its place
    ASSERT_TRUE(WaitUntil([&] { return m_service.Reportctl({"status"}) == 1; }))
        << "it notes it a moment later";
    EXPECT_THAT(At(Json(1), "outbox.lastFailure"), HasSubstr("upload-http://127.0.0.1:9"));
}

TEST_F(ServicesVerdict, StaysHealthyWithAVariableThatHasNoEffect) {
    m_service.SetEnvironment(NO_COLLECTOR);
    m_service.SetEnvironment("OTEL_BLRP_SCHEDULE_DELAY=5");
    m_service.Start();
    ASSERT_TRUE(WaitUntil([&] { return !m_service.LogLines(OUTBOX_SITE).empty(); }));
    EXPECT_THAT(m_service.LogLines(OUTBOX_SITE).front().message, HasSubstr("has no effect"));
    EXPECT_EQ(At(Json(0), "outbox.lastFailure"), "null");
}
