#include "Frame/FrameWorker.h"

#include <Poco/Format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "Frame/DBHelper.h"
#include "SystemTool/CommonTool.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/fakes/FakeSqlite.h"
#include "tests/support/CaughtExceptions.h"

using namespace SyncServiceReport;
using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace {

using Call = FakeSqliteState::Call;

class TheFrameWorker : public ::testing::Test {
protected:
    TheFrameWorker() { m_server.InitBaseInfo(); }
    ~TheFrameWorker() override { DBHelper::instance().Init(nullptr); }

    static auto Record(int level, const std::string& function, const std::string& message) {
        return AllOf(Field(&LogRecord::level, level), Field(&LogRecord::file, "Frame/FrameWorker"),
                     Field(&LogRecord::function, function), Field(&LogRecord::message, message));
    }

    /// Initialises the worker with these rows in BaseInfo.
    void InitWith(std::vector<std::vector<std::string>> rows) {
        m_db.rows = std::move(rows);
        EXPECT_TRUE(m_worker.Init());
    }

    std::string LastStatement() const { return m_db.calls.back().argument; }

    FakeSqliteState& m_db = FakeSqlite();
    ReportServer m_server;
    FrameWorker m_worker{&m_server};
};

ST_OptLog Log(const std::string& eventID, const std::string& value, const std::string& createTime,
              int pType) {
    ST_OptLog log;
    log.eventID = eventID;
    log.value = value;
    log.createTime = createTime;
    log.pType = pType;
    return log;
}

} // namespace

TEST_F(TheFrameWorker, InitOpensTheUsersDatabaseAndReadsTheBaseInformation) {
    EXPECT_TRUE(m_worker.Init());
    EXPECT_THAT(m_db.calls, ElementsAre(Call{"Open", SystemTool::CommonTool::GetUserDataDir() +
                                                         "/hublink/database/Report.db"},
                                        Call{"QuerySql", "select key ,value from BaseInfo ;"}));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(2, "Init", "FrameWorker load success")));
}

TEST_F(TheFrameWorker, ADatabaseThatDoesNotOpenIsNoFailureOfInit) {
    m_db.answers = {false};
    EXPECT_TRUE(m_worker.Init());
    EXPECT_THAT(FakeLogger().RecordsOf("Init"), ElementsAre(Record(2, "Init", "FrameWorker load success")));
}

TEST_F(TheFrameWorker, APluginThatMakesNoObjectIsLogged) {
    m_db.createsNothing = true;
    EXPECT_FALSE(m_worker.Init());
    EXPECT_THAT(
        FakeLogger().Records(),
        ElementsAre(Record(4, "Init",
                           "Failed to load sqlite plugin:" +
                               SystemTool::IO::Directory::GetExcutableDirectory() + "libOrvekSqlite.dylib")));
    FakeLogger().Clear();
    EXPECT_FALSE(m_worker.Send(Log("B1", "v", "1", 1)));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheFrameWorker, InitLogsEachKindOfException) {
    ExpectEachKindOfExceptionToBeLogged(m_db.throws, "Frame/FrameWorker", "Init", 0,
                                        [this] { return m_worker.Init(); });
}

TEST_F(TheFrameWorker, SendsBeforeInitFailSilently) {
    EXPECT_FALSE(m_worker.Send(Log("B1", "v", "1", 1)));
    EXPECT_THAT(m_db.calls, IsEmpty());
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheFrameWorker, StoredUserAndVersionBecomeTheServersAndStandInLaterRows) {
    InitWith({{"OpenID", "u1"}, {"HubLinkVersion", "5.1.0.2"}, {"Other", "ignored"}});
    EXPECT_EQ(m_server.GetBaseInfo().openID, "u1");
    EXPECT_EQ(m_server.GetBaseInfo().suiteVersion, "5.1.0.2");
    EXPECT_TRUE(m_worker.Send(Log("B100|1", R"({"a":1})", "1700000000000", 0)));
    EXPECT_EQ(LastStatement(), "insert into OperLog (eventID,value,createTime,pType,extData3,extData4) "
                               R"(values('B100|1', '{"a":1}','1700000000000',0,'5.1.0.2','u1'))");
}

TEST_F(TheFrameWorker, TheStatementIsWhatPocoFormatMakesOfAnyTexts) {
    InitWith({{"OpenID", "%s"}, {"HubLinkVersion", "{}"}});
    const std::string texts[] = {"",
                                 "it's",
                                 "%s%d%",
                                 "{} {0} {{}}",
                                 "\\n'",
                                 "\xff\xfe",
                                 std::string("a\0b", 3),
                                 std::string(9'000, 'x')};
    for (const auto& text : texts) {
        m_worker.Send(Log("B1|" + text, text, text, -1));
        EXPECT_EQ(LastStatement(),
                  Poco::format("insert into OperLog (eventID,value,createTime,pType,extData3,extData4) "
                               "values('%s', '%s','%s',%d,'%s','%s')",
                               "B1|" + text, text, text, -1, std::string("{}"), std::string("%s")));
    }
}

TEST_F(TheFrameWorker, AMissingVersionPassesItsDefaultOn) {
    ST_BaseInfo known;
    known.suiteVersion = "9.9.9.9";
    m_server.SetBaseInfo(known);
    InitWith({{"OpenID", "u1"}});
    EXPECT_EQ(m_server.GetBaseInfo().openID, "u1");
    EXPECT_EQ(m_server.GetBaseInfo().suiteVersion, "3.0.0.0");
}

TEST_F(TheFrameWorker, AMissingUserPassesItsDefaultOn) {
    ST_BaseInfo known;
    known.openID = "u9";
    m_server.SetBaseInfo(known);
    InitWith({{"HubLinkVersion", "5.1.0.2"}});
    EXPECT_EQ(m_server.GetBaseInfo().openID, "visitor");
}

TEST_F(TheFrameWorker, OfRowsWithTheSameKeyTheLaterCounts) {
    InitWith({{"OpenID", "u1"}, {"OpenID", "u2"}});
    EXPECT_EQ(m_server.GetBaseInfo().openID, "u2");
}

TEST_F(TheFrameWorker, KeysAreCaseSensitive) {
    InitWith({{"openid", "u1"}, {"HUBLINKVERSION", "5"}});
    EXPECT_EQ(m_server.GetBaseInfo().openID, "visitor");
    EXPECT_EQ(m_server.GetBaseInfo().suiteVersion, "3.0.0.0");
}

TEST_F(TheFrameWorker, AnEmptyStoredTextLeavesTheServersAlone) {
    ST_BaseInfo known;
    known.openID = "u9";
    m_server.SetBaseInfo(known);
    InitWith({{"OpenID", ""}});
    EXPECT_EQ(m_server.GetBaseInfo().openID, "u9");
}

TEST_F(TheFrameWorker, WithoutARowTheServerIsNotCalled) {
    InitWith({});
    EXPECT_THAT(FakeLogger().RecordsOf("SetBaseInfo"), IsEmpty());
}

TEST_F(TheFrameWorker, AFailedQueryDoesNotCallTheServer) {
    m_db.rows = {{"OpenID", "u1"}};
    m_db.answers = {true, false};
    EXPECT_TRUE(m_worker.Init());
    EXPECT_THAT(FakeLogger().RecordsOf("SetBaseInfo"), IsEmpty());
    EXPECT_EQ(FakeLogger().RecordsOf("QuerySql").size(), 1U);
}

TEST_F(TheFrameWorker, ALaterUserStandsInLaterRows) {
    InitWith({});
    EXPECT_TRUE(m_worker.Send(Log("B", "", "", 1)));
    EXPECT_THAT(LastStatement(), HasSubstr("values('B', '','',1,'3.0.0.0','visitor')"));
    ST_BaseInfo info;
    info.openID = "u7";
    info.suiteVersion = "7";
    m_server.SetBaseInfo(info);
    EXPECT_TRUE(m_worker.Send(Log("B", "", "", 1)));
    EXPECT_THAT(LastStatement(), HasSubstr("values('B', '','',1,'7','u7')"));
}

TEST_F(TheFrameWorker, TextsGoIntoTheStatementAsTheyAre) {
    InitWith({});
    EXPECT_TRUE(m_worker.Send(Log("100%s'", "it's %d", "\\", 1)));
    EXPECT_THAT(LastStatement(), HasSubstr("values('100%s'', 'it's %d','\\',1,"));
}

TEST_F(TheFrameWorker, AZeroByteStaysInTheStatement) {
    InitWith({});
    EXPECT_TRUE(m_worker.Send(Log("B", std::string("a\0b", 3), "", 1)));
    EXPECT_THAT(LastStatement(), HasSubstr(std::string("'a\0b'", 5)));
}

TEST_F(TheFrameWorker, ARejectedStatementIsLoggedOnceAndNotRetried) {
    InitWith({});
    m_db.answers = {false};
    EXPECT_FALSE(m_worker.Send(Log("B", "it's", "", 1)));
    EXPECT_EQ(FakeLogger().RecordsOf("ExecSql").size(), 1U);
    EXPECT_EQ(FakeLogger().RecordsOf("ExecSql").front().message, "scripted error-" + LastStatement());
    EXPECT_TRUE(m_worker.Send(Log("B", "its", "", 1))) << "the next record is stored normally";
}

TEST_F(TheFrameWorker, SendLogsEachKindOfException) {
    InitWith({});
    ExpectEachKindOfExceptionToBeLogged(m_db.throws, "Frame/FrameWorker", "Send", 0,
                                        [this] { return m_worker.Send(Log("B", "", "", 1)); });
}

TEST_F(TheFrameWorker, AnInitThatFailsAfterOpeningLeavesTheDatabaseInUse) {
    m_db.throwsIn = "QuerySql";
    m_db.throws = Throws::Std;
    EXPECT_FALSE(m_worker.Init());
    EXPECT_TRUE(m_worker.Send(Log("B", "", "", 1)));
}

TEST_F(TheFrameWorker, AnInitThatFailsWhileOpeningLeavesTheStoreUnused) {
    m_db.throws = Throws::Std;
    EXPECT_FALSE(m_worker.Init());
    m_db.throws = Throws::Nothing;
    FakeLogger().Clear();
    EXPECT_FALSE(m_worker.Send(Log("B", "", "", 1)));
    EXPECT_THAT(m_db.calls, ElementsAre(Call{"Open", m_db.calls.front().argument})) << "and no statement";
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheFrameWorker, AnExceptionOfThePluginsFactoryIsLogged) {
    m_db.createThrows = Throws::Std;
    EXPECT_FALSE(m_worker.Init());
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(3, "Init", "Std exception :scripted ")));
}

TEST_F(TheFrameWorker, ARowThatLacksItsValueIsPassedOver) {
    InitWith({{"OpenID"}, {}, {"HubLinkVersion", "5"}});
    EXPECT_EQ(m_server.GetBaseInfo().openID, "visitor");
    EXPECT_EQ(m_server.GetBaseInfo().suiteVersion, "5");
}

TEST_F(TheFrameWorker, ReadingTheBaseInformationHasNoGuardOfItsOwn) {
    InitWith({});
    m_db.throws = Throws::Std;
    EXPECT_THROW(m_worker.SetUserBaseInfo(), std::runtime_error);
}

TEST_F(TheFrameWorker, DestructionGivesTheDatabaseBack) {
    {
        FrameWorker worker(&m_server);
        EXPECT_TRUE(worker.Init());
    }
    EXPECT_EQ(m_db.created, 1);
    EXPECT_EQ(m_db.destroyed, 1);
}
