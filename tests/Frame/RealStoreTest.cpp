#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>

#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "App/ReportServer.h"
#include "Common/Paths.h"
#include "Frame/DBHelper.h"
#include "Frame/FrameWorker.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/StoreTables.h"
#include "tests/support/TemporaryDirectory.h"

using namespace SyncServiceReport;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::StartsWith;

// FrameWorker and DBHelper with the real SQLite plug-in on a real file.

namespace {

using Row = std::vector<std::string>;

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr double SANITIZER_SLOWNESS = 10;
#else
constexpr double SANITIZER_SLOWNESS = 1;
#endif

class RealStore : public ::testing::Test {
protected:
    RealStore() {
        std::filesystem::create_directories(Paths::Databases(m_data.Path()));
        Run("pragma journal_mode=wal");
        Run(STORE_TABLES);
        ::setenv("XDG_DATA_HOME", m_data.Path().c_str(), 1);
        m_server.InitBaseInfo();
    }
    ~RealStore() override { DBHelper::instance().Init(nullptr); }

    std::string File() const { return Paths::Store(m_data.Path()); }

    void Run(const std::string& sql) const {
        SQLite::Database database(File(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE, 5000);
        database.exec(sql);
    }

    std::vector<Row> Query(const std::string& sql) const {
        SQLite::Database database(File(), SQLite::OPEN_READWRITE, 5000);
        // The rows of a burst are committed together. This lock is granted only after that commit.
        database.exec("begin immediate");
        SQLite::Statement query(database, sql);
        std::vector<Row> rows;
        while (query.executeStep()) {
            rows.emplace_back();
            for (int column = 0; column < query.getColumnCount(); ++column)
                rows.back().push_back(query.getColumn(column).getString());
        }
        return rows;
    }

    void Init() {
        ASSERT_TRUE(m_worker.Init());
        FakeLogger().Clear();
    }

    bool Send(const std::string& eventID, const std::string& value = "", const std::string& createTime = "1",
              int pType = 1) {
        ST_OptLog log;
        log.eventID = eventID;
        log.value = value;
        log.createTime = createTime;
        log.pType = pType;
        return m_worker.Send(log);
    }

    TemporaryDirectory m_data;
    ReportServer m_server;
    FrameWorker m_worker{&m_server};
};

} // namespace

TEST_F(RealStore, StoresARecordWithItsColumns) {
    Init();
    EXPECT_TRUE(Send("B100|1", R"({"a":1})", "1700000000000", 0));
    EXPECT_THAT(
        Query("select eventID, value, createTime, pType, typeof(pType), extData1, extData3, extData4 from "
              "OperLog"),
        ElementsAre(Row{"B100|1", R"({"a":1})", "1700000000000", "0", "integer", "", "3.0.0.0", "visitor"}));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(RealStore, RejectsALoneQuoteAndStoresTheNextRecord) {
    Init();
    EXPECT_FALSE(Send("B1", "it's"));
    EXPECT_TRUE(Send("B2", "it''s"));
    EXPECT_THAT(Query("select eventID, value from OperLog"), ElementsAre(Row{"B2", "it's"}));
    const auto records = FakeLogger().Records();
    ASSERT_EQ(records.size(), 1U);
    EXPECT_THAT(records[0].message, StartsWith("near \"s\": syntax error-insert into OperLog "));
}

TEST_F(RealStore, ReadsTheStoredUserAndVersion) {
    Run("insert into BaseInfo values "
        "('OpenID','u0'),('OpenID','u1'),('HubLinkVersion','5.1.0.2'),('Other','x')");
    Init();
    EXPECT_EQ(m_server.GetBaseInfo().openID, "u1");
    EXPECT_EQ(m_server.GetBaseInfo().suiteVersion, "5.1.0.2");
    EXPECT_TRUE(Send("B1"));
    EXPECT_THAT(Query("select extData3, extData4 from OperLog"), ElementsAre(Row{"5.1.0.2", "u1"}));
}

TEST_F(RealStore, ANullCellReadsAsEmpty) {
    Run("insert into BaseInfo values ('OpenID',NULL),(NULL,'x'),('HubLinkVersion','5')");
    Init();
    EXPECT_EQ(m_server.GetBaseInfo().openID, "visitor");
    EXPECT_EQ(m_server.GetBaseInfo().suiteVersion, "5");
}

TEST_F(RealStore, AnEmptyBaseInfoIsNoErrorAndAMissingOneIs) {
    EXPECT_TRUE(m_worker.Init());
    EXPECT_THAT(FakeLogger().RecordsOf("QuerySql"), IsEmpty());
    Run("drop table BaseInfo");
    m_worker.SetUserBaseInfo();
    const auto records = FakeLogger().RecordsOf("QuerySql");
    ASSERT_EQ(records.size(), 1U);
    EXPECT_EQ(records[0].message, "no such table: BaseInfo-select key ,value from BaseInfo ;");
}

TEST_F(RealStore, AMissingTableFailsEachRecordUntilItIsMade) {
    Run("drop table OperLog");
    Init();
    EXPECT_FALSE(Send("B1"));
    EXPECT_THAT(FakeLogger().Records().back().message,
                StartsWith("no such table: OperLog-insert into OperLog "));
    Run("create table OperLog (eventID text, value text, createTime text, pType integer, extData3 text, "
        "extData4 text)");
    EXPECT_TRUE(Send("B2"));
}

TEST_F(RealStore, AMissingFileFailsEachRecordUntilItAppears) {
    std::filesystem::rename(File(), File() + ".away");
    std::filesystem::remove(File() + "-wal");
    EXPECT_TRUE(m_worker.Init());
    EXPECT_FALSE(Send("B1"));
    EXPECT_FALSE(std::filesystem::exists(File())) << "the service makes none";
    std::filesystem::rename(File() + ".away", File());
    EXPECT_TRUE(Send("B2"));
    EXPECT_THAT(Query("select eventID from OperLog"), ElementsAre(Row{"B2"}));
}

TEST_F(RealStore, ARowSurvivesAKillRightAfterSendReturned) {
    ChildProcess child([this] {
        const bool sent = m_worker.Init() && Send("B1", "survives");
        return ::kill(::getpid(), sent ? SIGKILL : SIGTERM);
    });
    ASSERT_EQ(child.Wait(), 128 + SIGKILL);
    EXPECT_THAT(Query("select value from OperLog"), ElementsAre(Row{"survives"}));
}

TEST_F(RealStore, WhatAReportSmugglesInHasNoEffectButOneRowOrOneError) {
    Init();
    const std::vector<std::string> smuggled = {
        "'); drop table OperLog; --",
        "'||(select group_concat(sql) from sqlite_master)||'",
        "'||(with recursive r(i) as (select 1 union all select i+1 from r) select max(i) from r)||'",
        "'); attach database '/tmp/other.db' as other; --",
        "'||load_extension('/tmp/x')||'",
        "'); pragma user_version=99; --",
        "'||zeroblob(1000000000)||'",
        "'||printf('%.*c',1000000000,'x')||'",
        "x','own','1',5,'v','u') --",
        "x','own','1',5,'v','u'),('more','rows','1',5,'v','u') --",
        "x','own','1',5,'v','u') returning (select 1) --",
    };
    for (const auto& text : smuggled)
        for (int place = 0; place < 6; ++place) {
            Run("delete from OperLog");
            FakeLogger().Clear();
            ST_OptLog log;
            log.eventID = place == 0 ? text : "B1";
            log.value = place == 1 ? text : "v";
            log.createTime = place == 2 ? text : "1";
            // The texts of suiteVersion and openID come from here. pType is a number and takes no text.
            ST_BaseInfo info;
            info.suiteVersion = place == 3 || place == 5 ? text : "3";
            info.openID = place == 4 || place == 5 ? text : "visitor";
            m_server.SetBaseInfo(info);
            FakeLogger().Clear();

            const std::clock_t begin = std::clock();
            const bool stored = m_worker.Send(log);
            const double milliseconds = 1000.0 * static_cast<double>(std::clock() - begin) / CLOCKS_PER_SEC;

            EXPECT_LT(milliseconds, 100 * SANITIZER_SLOWNESS) << text << " at " << place;
            EXPECT_EQ(Query("select 1 from OperLog").size(), stored ? 1U : 0U) << text << " at " << place;
            EXPECT_EQ(FakeLogger().RecordsOf("ExecSql").size(), stored ? 0U : 1U) << text << " at " << place;
        }
    EXPECT_THAT(Query("pragma integrity_check"), ElementsAre(Row{"ok"}));
    EXPECT_THAT(Query("pragma user_version"), ElementsAre(Row{"0"}));
    EXPECT_THAT(Query("select name from sqlite_master order by name"),
                ElementsAre(Row{"BaseInfo"}, Row{"OperLog"}));
}
