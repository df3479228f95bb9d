#include <csignal>
#include <filesystem>
#include <fstream>
#include <ostream>

#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/e2e/support/Disk.h"
#include "tests/e2e/support/FileSizeLimit.h"
#include "tests/e2e/support/Ledger.h"
#include "tests/support/WaitUntil.h"

using ::testing::Each;
using ::testing::Field;
using ::testing::IsEmpty;
using ::testing::IsSupersetOf;

// What is lost when Report.db cannot be used, and that the service recovers by itself when it can be used
// again.

namespace {

using namespace std::chrono_literals;
using Numbers = Ledger::Numbers;

class StoreFault : public ::testing::Test {
protected:
    void InstallAndStart() {
        m_service.Install();
        m_service.Start();
    }

    /// Sends this many reports, and waits until all are rows, before the fault comes.
    void StoreSome(int count = 20) {
        const int first = m_ledger.Next();
        m_ledger.Report(count);
        ASSERT_TRUE(WaitUntil([&] { return StoresAll(first); }));
    }

    bool StoresAll(int first) const {
        return std::ranges::includes(m_ledger.Stored(), Ledger::Range(first, m_ledger.Next()));
    }

    /// Expects that reports are stored again, without a restart, and that no further one is lost.
    void ExpectToGoOn() {
        EXPECT_TRUE(m_ledger.ReportUntilOneIsStored());
        StoreSome();
    }

    /// Expects that each report from `first` on is a row, or that its statement is in the log with this
    /// error.
    void ExpectEachStoredOrLogged(const std::string& error, int first = 0) {
        EXPECT_TRUE(m_ledger.AwaitEachStoredOrLogged(first));
        EXPECT_THAT(m_ledger.Lost(), Each(Field(&Ledger::LostOne::error, error)));
        for (const int number : m_ledger.LostNumbers())
            EXPECT_FALSE(m_ledger.Stored().contains(number));
    }

    /// The store and the files that belong to it.
    std::vector<std::string> Files() const {
        const auto store = m_service.DatabaseFile();
        return {store, store + "-wal", store + "-shm"};
    }

    void MoveAway() const {
        for (const auto& file : Files())
            if (std::filesystem::exists(file))
                std::filesystem::rename(file, file + ".away");
    }

    Service m_service;
    Ledger m_ledger{m_service};
};

} // namespace

TEST_F(StoreFault, AFullDiskCostsTheReportsThatTheLogHasAndNoOthers) {
    const Disk disk(m_service.DataDirectory() + "/hublink/database", 2'000'000);
    InstallAndStart();
    StoreSome();
    disk.Fill();
    ASSERT_TRUE(m_ledger.ReportUntilOneIsLost());
    m_ledger.Report(100);
    disk.MakeRoom();
    ExpectToGoOn();
    ExpectEachStoredOrLogged("database or disk is full");
}

TEST_F(StoreFault, ALockHeldForTenSecondsCostsNothing) {
    InstallAndStart();
    StoreSome();
    SQLite::Database other(m_service.DatabaseFile(), SQLite::OPEN_READWRITE);
    other.exec("begin immediate");
    const auto end = std::chrono::steady_clock::now() + 10s;
    while (std::chrono::steady_clock::now() < end) {
        const auto before = m_service.LogLines("App/ReportServer:42 Recv").size();
        m_ledger.Report(10);
        EXPECT_TRUE(m_service.AwaitLines("App/ReportServer:42 Recv", before + 10));
        WaitUntil([&] { return std::chrono::steady_clock::now() > end; }, 200ms); // keeps the pace
    }
    EXPECT_EQ(m_ledger.Stored(), Ledger::Range(0, 20));
    other.exec("commit");
    EXPECT_TRUE(WaitUntil([&] { return StoresAll(0); }));
    EXPECT_THAT(m_ledger.Lost(), IsEmpty());
}

TEST_F(StoreFault, ALockHeldForLongerCostsAReportForEveryFifteenSeconds) {
    InstallAndStart();
    StoreSome();
    SQLite::Database other(m_service.DatabaseFile(), SQLite::OPEN_READWRITE);
    other.exec("begin immediate");
    const auto begin = std::chrono::steady_clock::now();
    m_ledger.Report(20);
    ASSERT_TRUE(WaitUntil([&] { return !m_ledger.Lost().empty(); }, 30s));
    EXPECT_GE(std::chrono::steady_clock::now() - begin, 14s);
    other.exec("commit");
    ExpectEachStoredOrLogged("database is locked");
    EXPECT_EQ(m_ledger.Lost().size(), 1U);
    ExpectToGoOn();
}

TEST_F(StoreFault, TheMemoryOfABacklogIsGivenBackOnceItIsStored) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
    GTEST_SKIP() << "the sanitizers keep memory of their own";
#endif
    constexpr int REPORTS = 100'000;
    InstallAndStart();
    StoreSome();
    const auto rows = m_service.RowCount();
    const auto before = m_service.ResidentKilobytes();
    SQLite::Database other(m_service.DatabaseFile(), SQLite::OPEN_READWRITE);
    other.exec("begin immediate");
    for (int i = 0; i < REPORTS; ++i) {
        Service::Send(R"({"eventID":"B2|1","value":")" + std::string(150, 'x') + "\"}");
        if (i % 500 == 0) {
            ASSERT_TRUE(WaitUntil(Service::TookAllDatagrams));
        }
    }
    ASSERT_TRUE(WaitUntil(Service::TookAllDatagrams));
    EXPECT_GT(m_service.ResidentKilobytes() - before, 15'000) << "they wait in memory";
    other.exec("commit");
    ASSERT_TRUE(WaitUntil([&] { return m_service.RowCount() == rows + REPORTS; }, 30s));
    const auto isGivenBack = [&] { return m_service.ResidentKilobytes() - before < 8'000; };
    EXPECT_TRUE(WaitUntil(isGivenBack, 30s)) << "though no program sends";
}

TEST_F(StoreFault, ADeletedStoreCostsWhatWasInItAndWhatComesUntilSetUpMakesAnother) {
    InstallAndStart();
    StoreSome();
    const int first = m_ledger.Next();
    for (const auto& file : Files())
        std::filesystem::remove(file);
    ASSERT_TRUE(m_ledger.ReportUntilOneIsLost());
    m_ledger.Report(100);
    EXPECT_FALSE(std::filesystem::exists(m_service.DatabaseFile())) << "the service makes none";
    m_service.Install();
    ExpectToGoOn();
    ExpectEachStoredOrLogged("unable to open database file", first);
}

TEST_F(StoreFault, AFileSizeLimitEndsTheServiceWhenTheStoreReachesIt) {
    m_service.Install();
    {
        const FileSizeLimit limit(1'000'000); // the service inherits it
        m_service.Start();
    }
    for (int i = 0; i < 300; ++i)
        Service::Send(R"({"eventID":"B1","value":")" + std::string(10'000, 'x') + "\"}");
    EXPECT_EQ(m_service.AwaitEnd(), -SIGXFSZ);
}

TEST_F(StoreFault, TheStatementsInTheLogBringTheLostReportsBack) {
    InstallAndStart();
    MoveAway();
    m_ledger.Report(100);
    ASSERT_TRUE(m_ledger.ReportUntilOneIsLost());
    m_service.Install();
    EXPECT_TRUE(m_ledger.ReportUntilOneIsStored());
    SQLite::Database store(m_service.DatabaseFile(), SQLite::OPEN_READWRITE, 10'000);
    for (const auto& lost : m_ledger.Lost())
        store.exec(lost.statement);
    EXPECT_EQ(m_service.Count(m_service.DatabaseFile(), "select count(distinct eventID) from OperLog"),
              m_ledger.Next());
}

TEST_F(StoreFault, MissingTablesCostTheReportsThatComeUntilSetUpMakesThem) {
    m_service.Install();
    m_service.Query(m_service.DatabaseFile(), "drop table OperLog");
    m_service.Query(m_service.DatabaseFile(), "drop table BaseInfo");
    m_service.Start();
    m_ledger.Report(100);
    ASSERT_TRUE(m_ledger.ReportUntilOneIsLost());
    m_service.Install();
    ExpectToGoOn();
    ExpectEachStoredOrLogged("no such table: OperLog");
}

TEST_F(StoreFault, AStoreThatIsReplacedUnderLoadLosesNothing) {
    InstallAndStart();
    StoreSome();
    m_service.Query(m_service.DatabaseFile(), "vacuum into '" + m_service.DataDirectory() + "/new.db'");
    m_service.Query(m_service.DataDirectory() + "/new.db", "delete from OperLog");
    m_ledger.Report(500);
    std::filesystem::rename(m_service.DatabaseFile(), m_service.DatabaseFile() + ".away");
    std::filesystem::rename(m_service.DataDirectory() + "/new.db", m_service.DatabaseFile());
    m_ledger.Report(500);
    ExpectToGoOn();
    Numbers found = m_ledger.Stored();
    found.merge(m_ledger.LostNumbers());
    for (const auto& id :
         m_service.Query(m_service.DatabaseFile() + ".away", "select substr(eventID, 4) from OperLog"))
        found.insert(std::stoi(id));
    EXPECT_EQ(found, Ledger::Range(0, m_ledger.Next()));
}

TEST_F(StoreFault, AStoreThatMayOnlyBeReadCostsTheReportsThatComeUntilItMayBeWritten) {
    const Disk disk(m_service.DataDirectory() + "/hublink/database", 2'000'000);
    m_service.Install();
    disk.ForbidWriting();
    m_service.Start();
    m_ledger.Report(100);
    ASSERT_TRUE(m_ledger.ReportUntilOneIsLost());
    EXPECT_TRUE(m_ledger.AwaitEachStoredOrLogged());
    EXPECT_THAT(m_ledger.Stored(), IsEmpty());
    disk.AllowWriting();
    ExpectToGoOn();
    ExpectEachStoredOrLogged("unable to open database file");
}

namespace {

/// One kind of damage to the file.
struct Damage {
    const char* name;
    bool truncated;           ///< The file is cut; otherwise it is overwritten.
    std::uintmax_t keptBytes; ///< How many bytes at the beginning stay as they are. A page has 4096 bytes.
    const char* error;
};

void PrintTo(const Damage& damage, std::ostream* out) {
    *out << damage.error;
}

class DamagedStore : public StoreFault, public ::testing::WithParamInterface<Damage> {
protected:
    void DamageTheFile() const {
        const auto file = m_service.DatabaseFile();
        const auto size = std::filesystem::file_size(file);
        ASSERT_GT(size, 4 * 4096U);
        std::filesystem::resize_file(file, GetParam().keptBytes);
        if (!GetParam().truncated)
            std::ofstream(file, std::ios::app) << std::string(size - GetParam().keptBytes, 'x');
    }
};

} // namespace

TEST_P(DamagedStore, CostsWhatWasInItAndWhatComesUntilAnotherIsInItsPlace) {
    InstallAndStart();
    StoreSome(200);
    // The content of the write-ahead log would otherwise replace the damaged pages.
    m_service.Query(m_service.DatabaseFile(), "pragma wal_checkpoint(truncate)");
    DamageTheFile();
    const int first = m_ledger.Next();
    m_ledger.Report(100);
    ExpectEachStoredOrLogged(GetParam().error, first);
    EXPECT_EQ(m_ledger.LostNumbers(), Ledger::Range(first, m_ledger.Next()));
    MoveAway();
    m_service.Install();
    EXPECT_TRUE(m_ledger.ReportUntilOneIsStored());
    StoreSome();
}

INSTANTIATE_TEST_SUITE_P(OfAllKinds, DamagedStore,
                         ::testing::Values(Damage{"Overwritten", false, 0, "file is not a database"},
                                           Damage{"OverwrittenBehindItsFirstPage", false, 4096,
                                                  "database disk image is malformed"},
                                           Damage{"Truncated", true, 4096,
                                                  "database disk image is malformed"},
                                           Damage{"Emptied", true, 0, "no such table: OperLog"}),
                         [](const auto& damage) { return damage.param.name; });
