#include <filesystem>
#include <fstream>

#include <SQLiteCpp/SQLiteCpp.h>
#include <gtest/gtest.h>

#include "tests/e2e/support/Disk.h"
#include "tests/e2e/support/Service.h"
#include "tests/support/ModeOf.h"
#include "tests/support/WaitUntil.h"

// What the real service counts in its file. Nothing that happens to the file may lose a report.

namespace {

using ReportLedger::Outcome;
using ReportLedger::Sight;

class ServicesLedger : public ::testing::Test {
protected:
    ServicesLedger() { m_service.Install(); }

    /// Expects that the service stores a report, wherever it counts.
    void ExpectReportsToBeStored() {
        Service::Send(R"({"eventID":"B1"})");
        m_service.AwaitQuiet();
        EXPECT_EQ(m_service.RowCount(), 1);
    }

    /// Waits until this many datagrams have been received and have ended. Returns the counts.
    ReportLedger::Counts AwaitEndOf(std::uint64_t datagrams) {
        EXPECT_TRUE(WaitUntil([&] {
            const auto counts = m_service.Books().total;
            return counts[ReportLedger::RECEIVED] == datagrams && ReportLedger::EndedIn(counts) == datagrams;
        }));
        return m_service.Books().total;
    }

    Service m_service;
};

} // namespace

TEST_F(ServicesLedger, CountsEachKindOfDatagram) {
    m_service.Start();
    const std::vector<std::string> datagrams = {
        R"({"eventID":"B1","value":"stored"})",
        R"({"eventID":"B1","value":"it's"})",
        R"({"eventID":"A759|1"})",
        R"({"eventID":"A759|1","value":"no JSON"})",
        R"({"eventID":"A759"})",
        R"({"eventID":"A999|1"})",
        R"({"eventID":)",
        R"({"msgType":"init","exdata":{"moduleID":"A100"}})",
        R"({"msgType":"other"})",
        "%s",
        "",
        std::string(10240, 'x'),
    };
    for (const auto& datagram : datagrams)
        Service::Send(datagram);
    const auto counts = AwaitEndOf(datagrams.size());
    const auto expect = [&](Outcome outcome, std::uint64_t count) {
        EXPECT_EQ(counts[static_cast<unsigned>(outcome)], count) << static_cast<unsigned>(outcome);
    };
    expect(Outcome::Stored, 1);
    expect(Outcome::Store, 1);
    expect(Outcome::ToAnalytics, 1);
    expect(Outcome::ValueNotJson, 1);
    expect(Outcome::EventIdWithoutBar, 1);
    expect(Outcome::ModuleNotInit, 1);
    expect(Outcome::NotJson, 3);
    expect(Outcome::Control, 1);
    expect(Outcome::OtherControl, 1);
    EXPECT_EQ(counts[ReportLedger::EMPTY], 1U);
    EXPECT_EQ(counts[ReportLedger::AT_SIZE_LIMIT], 1U);
    EXPECT_EQ(counts[ReportLedger::UNFORMATTABLE], 1U);
    EXPECT_EQ(counts[ReportLedger::DROPPED_BY_KERNEL], 0U);
}

TEST_F(ServicesLedger, CountsReportsForADestinationThatIsNotThere) {
    m_service.Remove("libOrvekSqlite.dylib");
    m_service.Remove("libMetrikSdk.dylib");
    m_service.Start();
    Service::Send(R"({"eventID":"B1"})");
    Service::Send(R"({"eventID":"A759|1"})");
    AwaitEndOf(2);
    EXPECT_EQ(m_service.Counted(Outcome::NoStore), 1U);
    EXPECT_EQ(m_service.Counted(Outcome::Analytics), 1U);
}

TEST_F(ServicesLedger, NamesTheProcessItsVersionAndItsBuild) {
    m_service.Start();
    const auto books = m_service.Books();
    EXPECT_TRUE(books.counting);
    EXPECT_EQ(books.process, m_service.Process());
    EXPECT_FALSE(books.programVersion.empty());
    EXPECT_EQ(books.buildId.size(), 40U) << books.buildId;
}

TEST_F(ServicesLedger, IsNotTouchedByARefusedSecondInstance) {
    m_service.Start();
    Service::Send(R"({"eventID":"B1"})");
    AwaitEndOf(1);
    const auto before = m_service.Books();
    EXPECT_EQ(m_service.RunAnother(), 1);
    const auto after = m_service.Books();
    EXPECT_EQ(after.process, m_service.Process());
    EXPECT_EQ(after.startedAtMs, before.startedAtMs);
    EXPECT_EQ(after.total, before.total);
}

TEST_F(ServicesLedger, CountsWhatWaitedWhenTheServiceWasKilledAsLost) {
    m_service.Start();
    m_service.AwaitQuiet();
    SQLite::Database other(m_service.DatabaseFile(), SQLite::OPEN_READWRITE, 10'000);
    other.exec("begin immediate"); // the store waits for this transaction
    for (int i = 0; i < 10; ++i)
        Service::Send(R"({"eventID":"B1"})");
    EXPECT_TRUE(WaitUntil([&] { return m_service.Counted(ReportLedger::QUEUED) == 11; }));
    const auto waiting = ReportLedger::WaitingIn(m_service.Books().total);
    EXPECT_GE(waiting, 5U);
    EXPECT_TRUE(m_service.Books().balanced);
    m_service.Kill();
    const auto books = m_service.Books();
    EXPECT_FALSE(books.counting);
    EXPECT_EQ(books.total[ReportLedger::LOST_AT_ENDS], waiting);
    EXPECT_EQ(ReportLedger::WaitingIn(books.total), 0U);
    other.exec("rollback");
    m_service.Start();
    EXPECT_EQ(m_service.Counted(ReportLedger::LOST_AT_ENDS), waiting);
    EXPECT_GE(m_service.Counted(ReportLedger::MOST_WAITING), waiting);
    EXPECT_EQ(SinceStart(m_service.Books())[ReportLedger::RECEIVED], 0U);
}

TEST_F(ServicesLedger, ThatIsDamagedCostsTheOldCountsAndNothingElse) {
    std::filesystem::create_directories(m_service.DataDirectory() + "/hublink/run");
    std::ofstream(m_service.LedgerFile()) << "no ledger at all";
    m_service.Start();
    ExpectReportsToBeStored();
    EXPECT_EQ(m_service.Counted(Outcome::Stored), 2U) << "with the marker";
    EXPECT_EQ(m_service.Books().begun, ReportLedger::Begun::Damaged);
    EXPECT_TRUE(std::filesystem::exists(m_service.LedgerFile() + ".set-aside"));
}

TEST_F(ServicesLedger, OnAFullOrReadOnlyDiskIsKeptInMemoryAndReportsAreStored) {
    const Disk disk(m_service.DataDirectory() + "/hublink/run", 1'000'000);
    disk.Fill();
    m_service.Start();
    ExpectReportsToBeStored();
    EXPECT_EQ(m_service.Books().sight, Sight::Missing);
    m_service.Kill();
    disk.ForbidWriting();
    m_service.Start();
    m_service.AwaitQuiet();
    EXPECT_EQ(m_service.Books().sight, Sight::Missing);
}

TEST_F(ServicesLedger, SaysNothingInTheLog) {
    m_service.Start();
    for (const auto& line : m_service.LogLines())
        EXPECT_EQ(line.message.find("ledger"), std::string::npos) << line.message;
}
