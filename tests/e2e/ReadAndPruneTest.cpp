#include <filesystem>

#include <SQLiteCpp/Database.h>
#include <gtest/gtest.h>

#include "tests/e2e/support/Service.h"
#include "tests/e2e/support/SteadyReports.h"
#include "tests/support/WaitUntil.h"

// What people do with the store while the service writes to it. No report that is sent meanwhile may be lost
// or refused.

namespace {

using namespace std::chrono_literals;

constexpr int OLD_ROWS = 150'000;
std::string NewReport(int) {
    return R"({"eventID":"new|1","value":"as people write it","createTime":1900000000})";
}

class StoreInUse : public testing::Test {
protected:
    void SetUp() override {
        m_service.Install();
        SQLite::Database(m_service.DatabaseFile(), SQLite::OPEN_READWRITE)
            .exec("with recursive n(i) as (select 1 union all select i + 1 from n where i < " +
                  std::to_string(OLD_ROWS) +
                  ") insert into OperLog (eventID, value, createTime) select 'old|1', 'value ' || i, "
                  "1700000000000 from n");
        m_service.Start();
    }

    /// Expects that every report that was sent is stored, that nothing was dropped or refused, and that the
    /// ledger says the same.
    void ExpectAllStored(int sent) {
        m_service.AwaitQuiet();
        EXPECT_EQ(
            m_service.Count(m_service.DatabaseFile(), "select count(*) from OperLog where eventID = 'new|1'"),
            sent);
        EXPECT_EQ(Service::DroppedByKernel(), 0);
        EXPECT_EQ(m_service.Counted(ReportLedger::Outcome::Store), 0u);
        EXPECT_GT(sent, 0);
    }

    std::uintmax_t WalBytes() const { return std::filesystem::file_size(m_service.DatabaseFile() + "-wal"); }

    Service m_service;
};

TEST_F(StoreInUse, IsPrunedWithoutAReportLost) {
    const auto before = std::filesystem::file_size(m_service.DatabaseFile());
    SteadyReports reports(NewReport);
    ASSERT_EQ(m_service.Reportctl({"prune", "--older-than", "2025-01-01", "--yes"}), 0) << m_service.Output();
    const auto walBytes = WalBytes();
    // The file becomes shorter when the write-ahead log has been merged and no writer has newer pages in it.
    // The service's own merge may come a little later.
    EXPECT_TRUE(WaitUntil([&] { return std::filesystem::file_size(m_service.DatabaseFile()) < before / 2; }))
        << "the space was not given back";
    ExpectAllStored(reports.Stop());
    EXPECT_EQ(
        m_service.Count(m_service.DatabaseFile(), "select count(*) from OperLog where eventID = 'old|1'"), 0);
    EXPECT_LT(walBytes, before) << "the write-ahead log grew with what was deleted";
}

TEST_F(StoreInUse, IsExportedCountedAndCopiedWithoutAReportLost) {
    const auto copy = m_service.DataDirectory() + "/backup";
    SteadyReports reports(NewReport);
    for (const auto& arguments :
         {std::vector<std::string>{"export", "--output", m_service.DataDirectory() + "/out.csv"},
          std::vector<std::string>{"stats", "--by", "hour"}, std::vector<std::string>{"backup", copy}})
        ASSERT_EQ(m_service.Reportctl(arguments), 0) << m_service.Output();
    ExpectAllStored(reports.Stop());
    EXPECT_EQ(m_service.Count(copy + "/Report.db", "select count(*) from OperLog where eventID = 'old|1'"),
              OLD_ROWS);
}

TEST_F(StoreInUse, IsCountedByOutcome) {
    Service::Send(R"({"eventID":"new|1","value":"x","createTime":1900000000})");
    Service::Send("no JSON");
    m_service.AwaitQuiet(); // this also sends a report
    ASSERT_EQ(m_service.Reportctl({"stats", "--by", "outcome", "--json"}), 0);
    EXPECT_NE(m_service.Output().find(R"([{"key":"stored","count":2},{"key":"refused.notJson","count":1}])"),
              std::string::npos)
        << m_service.Output();
}

} // namespace
