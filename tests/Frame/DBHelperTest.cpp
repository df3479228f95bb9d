#include "Frame/DBHelper.h"

#include <latch>
#include <set>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Plugin/ModuleLoader.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/fakes/FakeSqlite.h"
#include "tests/support/ScriptedSleep.h"

using SyncServiceReport::DBHelper;
using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::IsEmpty;

namespace {

using Rows = std::vector<std::vector<std::string>>;
using Call = FakeSqliteState::Call;

class TheDBHelper : public ::testing::Test {
protected:
    TheDBHelper() { m_helper.Init(m_loader.GetModule()); }
    ~TheDBHelper() override { m_helper.Init(nullptr); }

    /// A record of DBHelper, with any line number.
    static auto Error(const std::string& function, const std::string& message) {
        return AllOf(Field(&LogRecord::level, 4), Field(&LogRecord::file, "Frame/DBHelper"),
                     Field(&LogRecord::function, function), Field(&LogRecord::message, message),
                     Field(&LogRecord::tag, ""), Field(&LogRecord::reserved, 0));
    }

    SystemTool::ModuleLoader<ISqliteDatabase> m_loader{SystemTool::IO::Directory::GetExcutableDirectory() +
                                                       "libOrvekSqlite.dylib"};
    DBHelper& m_helper = DBHelper::instance();
    FakeSqliteState& m_db = FakeSqlite();
};

class DBHelperWithoutPlugin : public ::testing::Test {
protected:
    DBHelper& m_helper = DBHelper::instance();
};

} // namespace

TEST(DBHelper, IsOneInstance) {
    EXPECT_EQ(&DBHelper::instance(), &DBHelper::instance());
}

TEST(DBHelper, IsOneInstanceAlsoWhenThreadsAskForItFirstAtTheSameTime) {
    constexpr std::size_t THREADS = 8;
    std::latch start(THREADS);
    std::vector<DBHelper*> seen(THREADS);
    {
        std::vector<std::jthread> threads;
        for (DBHelper*& instance : seen)
            threads.emplace_back([&start, &instance] {
                start.arrive_and_wait();
                instance = &DBHelper::instance();
            });
    }
    EXPECT_EQ(std::set<DBHelper*>(seen.begin(), seen.end()).size(), 1U);
}

TEST_F(DBHelperWithoutPlugin, OperationsFailSilently) {
    EXPECT_FALSE(m_helper.CreateTable("create table t (a)"));
    EXPECT_FALSE(m_helper.ExecSql("select 1"));
    EXPECT_FALSE(m_helper.BatExecSql({"select 1"}));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(DBHelperWithoutPlugin, AQueryFailsSilentlyAndEmptiesTheRows) {
    Rows rows = {{"left", "over"}};
    EXPECT_FALSE(m_helper.QuerySql("select 1", rows));
    EXPECT_THAT(rows, IsEmpty());
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheDBHelper, InitIsTrueAndTakesAnotherObjectLater) {
    EXPECT_TRUE(m_helper.Init(nullptr));
    EXPECT_FALSE(m_helper.ExecSql("select 1"));
    EXPECT_TRUE(m_helper.Init(m_loader.GetModule()));
    EXPECT_TRUE(m_helper.ExecSql("select 1"));
}

TEST_F(TheDBHelper, PassesStatementsOnUnchanged) {
    const std::string sql = " select 'it''s' , \"%s\";; -- \n";
    Rows rows;
    int count = 0;
    EXPECT_TRUE(m_helper.CreateTable(sql));
    EXPECT_TRUE(m_helper.ExecSql(sql));
    EXPECT_FALSE(m_helper.QuerySql(sql, rows));
    EXPECT_TRUE(m_helper.BatExecSql({sql, sql}));
    EXPECT_TRUE(m_helper.GetTotalCount(sql, count));
    EXPECT_THAT(m_db.calls, ElementsAre(Call{"CreateTable", sql}, Call{"ExecSql", sql}, Call{"QuerySql", sql},
                                        Call{"BatExecSql", sql + " " + sql}, Call{"count was", "0"},
                                        Call{"GetTotalCount", sql}));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheDBHelper, AFailureIsLoggedAsErrorTextHyphenStatement) {
    m_db.answer = false;
    m_db.errorText = "no such table";
    Rows rows;
    int count = 0;
    EXPECT_FALSE(m_helper.CreateTable("select 1"));
    EXPECT_FALSE(m_helper.ExecSql("select 1"));
    EXPECT_FALSE(m_helper.QuerySql("select 1", rows));
    EXPECT_FALSE(m_helper.GetTotalCount("select 1", count));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Error("CreateTable", "no such table-select 1"),
                                                    Error("ExecSql", "no such table-select 1"),
                                                    Error("QuerySql", "no such table-select 1"),
                                                    Error("GetTotalCount", "no such table-select 1")));
}

TEST_F(TheDBHelper, PercentSignsOfErrorAndStatementAreLoggedAsTheyAre) {
    m_db.answer = false;
    m_db.errorText = "near \"%d\"";
    EXPECT_FALSE(m_helper.ExecSql("select '%s'"));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Error("ExecSql", "near \"%d\"-select '%s'")));
}

TEST_F(TheDBHelper, AFailureThatIsTooLongForTheLogIsFalseAndMarked) {
    m_db.answer = false;
    const std::string statement(1024 * 1024, 'x');
    EXPECT_FALSE(m_helper.ExecSql(statement));
    EXPECT_THAT(
        FakeLogger().Records(),
        ElementsAre(Error("ExecSql", "[BoostLogError]the text would have 1048591 bytes, more than the "
                                     "1048576 of a log record")));
}

TEST_F(TheDBHelper, AFailureThatTheLoggerDoesNotTakeIsFalseAllTheSame) {
    m_db.answer = false;
    FakeLogger().throws = Throws::Std;
    Rows rows;
    int count = 0;
    EXPECT_FALSE(m_helper.CreateTable("a"));
    EXPECT_FALSE(m_helper.ExecSql("a"));
    EXPECT_FALSE(m_helper.QuerySql("a", rows));
    EXPECT_FALSE(m_helper.GetTotalCount("a", count));
    EXPECT_FALSE(m_helper.BatExecSql({"a"}));
    EXPECT_EQ(m_db.calls.size(), 8U) << "each was tried, the batch three times";
}

TEST_F(TheDBHelper, AQueryIsTrueWhenARowCameBack) {
    m_db.rows = {{"OpenID", "u1"}, {"HubLinkVersion", "5.1.0.2"}};
    Rows rows = {{"left", "over"}};
    EXPECT_TRUE(m_helper.QuerySql("select key ,value from BaseInfo ;", rows));
    EXPECT_EQ(rows, m_db.rows);
}

TEST_F(TheDBHelper, AQueryWithoutARowIsFalseAndLogsNothing) {
    Rows rows = {{"left", "over"}};
    EXPECT_FALSE(m_helper.QuerySql("select 1 where 0", rows));
    EXPECT_THAT(rows, IsEmpty());
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheDBHelper, ABatchThatFailsOnceIsTriedAgainAfterAPause) {
    m_db.answers = {false, true};
    EXPECT_TRUE(m_helper.BatExecSql({"a", "b"}));
    EXPECT_THAT(Pauses(), ElementsAre(1000));
    EXPECT_THAT(m_db.calls, ElementsAre(Call{"BatExecSql", "a b"}, Call{"BatExecSql", "a b"}));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Error("BatExecSql", "scripted error")));
}

TEST_F(TheDBHelper, ABatchThatKeepsFailingIsTriedThreeTimesWithThreePauses) {
    m_db.answer = false;
    EXPECT_FALSE(m_helper.BatExecSql({"a"}));
    EXPECT_THAT(Pauses(), ElementsAre(1000, 1000, 1000)) << "the last failure pauses too";
    EXPECT_EQ(m_db.calls.size(), 3U);
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(Error("BatExecSql", "scripted error"), Error("BatExecSql", "scripted error"),
                            Error("BatExecSql", "scripted error")));
}

TEST_F(TheDBHelper, ABatchErrorWithADirectiveIsABoostLogErrorAndIsRetried) {
    m_db.answers = {false, true};
    m_db.errorText = "near %d";
    EXPECT_TRUE(m_helper.BatExecSql({"a"}));
    EXPECT_THAT(
        FakeLogger().Records(),
        ElementsAre(Error("BatExecSql", "[BoostLogError]boost::too_few_args: format-string referred to more "
                                        "arguments than were passed")));
}

TEST_F(TheDBHelper, ACountIsResetBeforeThePluginIsAsked) {
    m_db.count = -1;
    m_db.answer = false;
    int count = 99;
    EXPECT_FALSE(m_helper.GetTotalCount("select count(*) from OperLog", count));
    EXPECT_EQ(count, 0);
    EXPECT_EQ(m_db.calls.front(), (Call{"count was", "0"}));
}

TEST_F(TheDBHelper, AFailedCountKeepsWhatThePluginStored) {
    m_db.count = 5;
    m_db.answer = false;
    int count = 99;
    EXPECT_FALSE(m_helper.GetTotalCount("select count(*) from OperLog", count));
    EXPECT_EQ(count, 5);
}

TEST_F(TheDBHelper, ThePluginsExceptionsGoToTheCaller) {
    Rows rows;
    int count = 0;
    const auto expectAll = [&]<typename Exception>(Throws what, const Exception&) {
        m_db.throws = what;
        EXPECT_THROW(m_helper.ExecSql("a"), Exception);
        EXPECT_THROW(m_helper.CreateTable("a"), Exception);
        EXPECT_THROW(m_helper.QuerySql("a", rows), Exception);
        EXPECT_THROW(m_helper.BatExecSql({"a"}), Exception);
        EXPECT_THROW(m_helper.GetTotalCount("a", count), Exception);
    };
    expectAll(Throws::Poco, Poco::IOException());
    expectAll(Throws::Std, std::runtime_error(""));
    expectAll(Throws::Other, 42);
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST(DBHelperDeathTest, ACountWithoutAPluginIsACrashAndNotAZero) {
    int count = 0;
    EXPECT_DEATH(DBHelper::instance().GetTotalCount("select 1", count), "");
}
