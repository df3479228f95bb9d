#include <chrono>
#include <filesystem>
#include <functional>

#include <SQLiteCpp/Database.h>
#include <gtest/gtest.h>
#include <sys/resource.h>

#include "tests/e2e/support/Service.h"
#include "tests/e2e/support/SteadyReports.h"

// A store of a busy year. What time a command takes is the processor's, which other programs of the machine
// hardly change: these commands wait for little else.

namespace {

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr int ROWS = 100'000; // a program with a sanitizer is much slower
#else
constexpr int ROWS = 5'000'000;
#endif

/// Seconds of processor time that the children of this process have taken.
double ChildrensSeconds() {
    struct rusage usage {};
    ::getrusage(RUSAGE_CHILDREN, &usage);
    const auto seconds = [](const timeval& time) { return double(time.tv_sec) + double(time.tv_usec) / 1e6; };
    return seconds(usage.ru_utime) + seconds(usage.ru_stime);
}

/// Of the largest child of this process, in MiB.
long PeakMemory() {
    struct rusage usage {};
    ::getrusage(RUSAGE_CHILDREN, &usage);
    return usage.ru_maxrss / 1024;
}

class LargeStore : public testing::Test {
protected:
    void SetUp() override {
        m_service.Install();
        SQLite::Database database(m_service.DatabaseFile(), SQLite::OPEN_READWRITE);
        database.exec("pragma synchronous = off");
        database.exec(
            "with recursive n(i) as (select 0 union all select i + 1 from n where i + 1 < " +
            std::to_string(ROWS) +
            ") insert into OperLog (eventID, value, createTime, pType, extData3, extData4) "
            "select 'B' || (100 + i % 20) || '|' || (i % 500), "
            "case i % 2 when 0 then '{\"text\":\"opened the door\",\"number\":' || i || '}' "
            "else 'opened the door ' || i end, 1700000000000 + i * 1000, 0, '5.1.0.2', 'u1' from n");
    }

    /// Runs the command, which must succeed with this code in less than so much processor time.
    void ExpectWithin(double seconds, const std::vector<std::string>& arguments, int exitCode = 0) const {
        const auto before = ChildrensSeconds();
        EXPECT_EQ(m_service.Reportctl(arguments), exitCode) << arguments[0] << ": " << m_service.Output();
        const auto taken = ChildrensSeconds() - before;
        EXPECT_LT(taken, seconds) << arguments[0];
        RecordProperty("seconds_of_" + arguments[0], std::to_string(taken));
    }

    std::string Path(const std::string& name) const { return m_service.DataDirectory() + "/" + name; }
    std::int64_t Rows(const std::string& file, const std::string& condition) const {
        return m_service.Count(file, "select count(*) from OperLog where " + condition);
    }

    Service m_service;
};

TEST_F(LargeStore, IsReadInTimeAndReadAndPrunedBesideTheServiceWithoutAReportLost) {
    constexpr int DOWN = 2; // no service runs
    ExpectWithin(0.1, {"status"}, DOWN);
    ExpectWithin(15, {"export", "--format", "jsonl", "--output", Path("rows.jsonl")});
    EXPECT_GT(std::filesystem::file_size(Path("rows.jsonl")), std::uintmax_t{ROWS} * 80);
    std::filesystem::remove(Path("rows.jsonl"));
    ExpectWithin(5, {"stats", "--by", "event", "--json"});
    ExpectWithin(10, {"stats", "--by", "hour", "--since", "2023-11-15", "--top", "3"});
    ExpectWithin(15, {"page", Path("page.html")});
    EXPECT_LT(PeakMemory(), 64) << "a command keeps the rows that it reads";
    RecordProperty("mebibytes_of_the_largest", std::to_string(PeakMemory()));

    m_service.Start();
    SteadyReports reports([](int) {
        return std::string(R"({"eventID":"new|1","value":"as people write it","createTime":1900000000})");
    });
    ExpectWithin(0.1, {"status"});
    ExpectWithin(15, {"find", "\"number\":" + std::to_string(ROWS - 2) + "}"});
    ExpectWithin(15, {"export", "--format", "csv", "--output", Path("rows.csv")});
    EXPECT_GT(std::filesystem::file_size(Path("rows.csv")), std::uintmax_t{ROWS} * 80);
    ExpectWithin(10, {"stats", "--by", "module"});
    ExpectWithin(10, {"backup", Path("backup")});
    ExpectWithin(20, {"prune", "--keep-rows", std::to_string(ROWS * 9 / 10), "--yes"});
    const int sent = reports.Stop();
    m_service.AwaitQuiet();

    EXPECT_EQ(Rows(m_service.DatabaseFile(), "eventID = 'new|1'"), sent);
    EXPECT_EQ(Service::DroppedByKernel(), 0);
    EXPECT_EQ(m_service.Counted(ReportLedger::Outcome::Store), 0u);
    EXPECT_EQ(Rows(Path("backup/Report.db"), "eventID <> 'new|1'"), ROWS);
    EXPECT_LE(m_service.RowCount(), ROWS * 9 / 10 + sent + 1);
}

} // namespace
