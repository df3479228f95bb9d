#include "Metrik/MetrikWorker.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "SystemTool/CommonTool.h"
#include "SystemTool/IO/JsonDocument.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/fakes/FakeSdk.h"
#include "tests/support/CaughtExceptions.h"
#include "tests/support/ScriptedJson.h"

using namespace SyncServiceReport;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

namespace {

using Call = FakeSdkState::Call;

LogRecord Record(int level, const std::string& function, int line, const std::string& message) {
    return {level, "Metrik/MetrikWorker", function, line, message};
}

class TheMetrikWorker : public ::testing::Test {
protected:
    TheMetrikWorker() {
        m_server.InitBaseInfo();
        ST_BaseInfo info;
        info.openID = "u1";
        info.suiteVersion = "5.1.0.2";
        m_server.SetBaseInfo(info);
        FakeLogger().Clear();
    }

    bool Send(const std::string& value) {
        ST_OptLog log;
        log.eventID = "A759|10001";
        log.value = value;
        log.createTime = "1700000000123";
        return m_worker.Send(log);
    }

    /// The JSON of the last event that the SDK was given.
    std::string LastEvent() const { return m_sdk.calls.back().arguments.at(1); }

    FakeSdkState& m_sdk = FakeSdk();
    ReportServer m_server;
    MetrikWorker m_worker{&m_server};
    const std::string m_osVersion = SystemTool::CommonTool::GetOSVersionString();
};

const ST_InitMsg MESSAGE{.moduleID = "A100",
                         .moduleVersion = "2.1",
                         .moduleName = "Painter",
                         .logPath = "/logs",
                         .dbPath = "/db",
                         .openID = "u2",
                         .hublinkVersion = "6"};

} // namespace

TEST_F(TheMetrikWorker, InitDefalutStartsTheSdkForTheDefaultModuleInTheUsersDirectories) {
    EXPECT_TRUE(m_worker.InitDefalut());
    const std::string hublink = SystemTool::CommonTool::GetUserDataDir() + "/hublink";
    EXPECT_THAT(m_sdk.calls,
                ElementsAre(Call{2, 1, {"A759", "1", "default", hublink + "/log", hublink + "/database"}}));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheMetrikWorker, InitPassesTheMessagesFieldsInOrder) {
    EXPECT_TRUE(m_worker.Init(MESSAGE));
    EXPECT_THAT(m_sdk.calls, ElementsAre(Call{2, 1, {"A100", "2.1", "Painter", "/logs", "/db"}}));
}

TEST_F(TheMetrikWorker, InitPassesEmptyFieldsEmpty) {
    EXPECT_TRUE(m_worker.Init({}));
    EXPECT_THAT(m_sdk.calls, ElementsAre(Call{2, 1, {"", "", "", "", ""}}));
}

TEST_F(TheMetrikWorker, TheResultOfStartingTheSdkIsIgnored) {
    m_sdk.initAnswer = false;
    EXPECT_TRUE(m_worker.InitDefalut());
    EXPECT_TRUE(m_worker.Init(MESSAGE));
    EXPECT_TRUE(Send(""));
}

TEST_F(TheMetrikWorker, ASecondInitialisationReplacesTheSdkObject) {
    EXPECT_TRUE(m_worker.Init(MESSAGE));
    EXPECT_TRUE(m_worker.Init(MESSAGE));
    EXPECT_EQ(m_sdk.created, 2);
    EXPECT_EQ(m_sdk.destroyed, 1);
    EXPECT_TRUE(Send(""));
    EXPECT_EQ(m_sdk.calls.back().object, 2);
}

TEST_F(TheMetrikWorker, AnSdkThatMakesNoObjectIsLogged) {
    m_sdk.createsNothing = true;
    EXPECT_FALSE(m_worker.InitDefalut());
    EXPECT_FALSE(m_worker.Init(MESSAGE));
    // The loader has no error text for a plug-in that was opened but made no object.
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(Record(4, "InitDefalut", 38, "Failed to load metrik sdk interface:"),
                            Record(4, "Init", 73, "Failed to load metrik sdk interface:")));
    FakeLogger().Clear();
    EXPECT_FALSE(Send("{}"));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheMetrikWorker, InitDefalutLogsEachKindOfException) {
    ExpectEachKindOfExceptionToBeLogged(m_sdk.initThrows, "Metrik/MetrikWorker", "InitDefalut", 56,
                                        [this] { return m_worker.InitDefalut(); });
}

TEST_F(TheMetrikWorker, AnInitialisationThatFailedLeavesNothingToSendTo) {
    m_sdk.initThrows = Throws::Std;
    EXPECT_FALSE(m_worker.InitDefalut());
    EXPECT_FALSE(Send("{}"));
    EXPECT_THROW(m_worker.Init(MESSAGE), std::runtime_error);
    EXPECT_FALSE(Send("{}"));
    for (const Call& call : m_sdk.calls)
        EXPECT_EQ(call.slot, 2) << "no event was reported";
}

TEST_F(TheMetrikWorker, AnExceptionOfThePluginsFactoryIsLoggedByInitDefalut) {
    m_sdk.createThrows = Throws::Std;
    EXPECT_FALSE(m_worker.InitDefalut());
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(Record(3, "InitDefalut", 56, "Std exception :scripted ")));
    EXPECT_THROW(m_worker.Init(MESSAGE), std::runtime_error);
}

TEST_F(TheMetrikWorker, AnExceptionLeavesInitUnlogged) {
    m_sdk.initThrows = Throws::Std;
    EXPECT_THROW(m_worker.Init(MESSAGE), std::runtime_error);
    m_sdk.initThrows = Throws::Poco;
    EXPECT_THROW(m_worker.Init(MESSAGE), Poco::IOException);
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheMetrikWorker, SendBeforeAnInitialisationIsFalseAndSilent) {
    EXPECT_FALSE(Send("{}"));
    EXPECT_THAT(m_sdk.calls, IsEmpty());
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheMetrikWorker, SendsTheEventIdAndTheEventAsJson) {
    ASSERT_TRUE(m_worker.InitDefalut());
    EXPECT_TRUE(Send(R"({"button":"save","n":[1,2.5,9007199254740993]})"));
    EXPECT_EQ(
        m_sdk.calls.back(),
        (Call{3,
              1,
              {"A759|10001", R"({"extend":{"hublinkVersion":"5.1.0.2","createTime":"1700000000123"},)"
                             R"("eventData":{"button":"save","n":[1,2.5,9007199254740993],"openid":"u1",)"
                             R"("sys_version":")" +
                                 m_osVersion + R"("}})"}}));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheMetrikWorker, AnEmptyValueLeavesTheOpenIdAndTheSystemVersion) {
    ASSERT_TRUE(m_worker.InitDefalut());
    EXPECT_TRUE(Send(""));
    EXPECT_EQ(LastEvent(), R"({"extend":{"hublinkVersion":"5.1.0.2","createTime":"1700000000123"},)"
                           R"("eventData":{"openid":"u1","sys_version":")" +
                               m_osVersion + R"("}})");
}

TEST_F(TheMetrikWorker, MembersOfTheValueThatTheServiceOwnsAreReplaced) {
    ASSERT_TRUE(m_worker.InitDefalut());
    EXPECT_TRUE(Send(R"({"openid":"forged","a":1,"sys_version":"forged","openid":"again"})"));
    EXPECT_THAT(LastEvent(),
                ::testing::HasSubstr(R"("eventData":{"openid":"u1","a":1,"sys_version":")" + m_osVersion));
    EXPECT_EQ(LastEvent().find("forged"), std::string::npos);
    EXPECT_EQ(LastEvent().find("again"), std::string::npos);
}

TEST_F(TheMetrikWorker, TheBaseInformationIsReadAtEverySend) {
    ASSERT_TRUE(m_worker.InitDefalut());
    EXPECT_TRUE(Send("{}"));
    ST_BaseInfo info;
    info.openID = "u9";
    info.suiteVersion = "9";
    m_server.SetBaseInfo(info);
    EXPECT_TRUE(Send("{}"));
    EXPECT_THAT(LastEvent(), ::testing::HasSubstr(R"("openid":"u9")"));
    EXPECT_THAT(LastEvent(), ::testing::HasSubstr(R"("hublinkVersion":"9")"));
}

TEST_F(TheMetrikWorker, AValueThatIsNoJsonIsLoggedAndNotSent) {
    ASSERT_TRUE(m_worker.InitDefalut());
    EXPECT_FALSE(Send("plain text"));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(4, "Send", 107, "Invalid value. At byte 0.")));
    EXPECT_EQ(m_sdk.calls.size(), 1U) << "nothing but the initialisation";
}

TEST_F(TheMetrikWorker, AValueThatIsNoObjectIsLoggedAndNotSent) {
    ASSERT_TRUE(m_worker.InitDefalut());
    EXPECT_FALSE(Send("5"));
    EXPECT_THAT(
        FakeLogger().Records(),
        ElementsAre(Record(3, "Send", 121,
                           "Std exception :A member cannot be set in a JSON value that is no object: 5 ")));
    EXPECT_EQ(m_sdk.calls.size(), 1U);
}

TEST_F(TheMetrikWorker, TheSdksAnswerIsTheResult) {
    ASSERT_TRUE(m_worker.InitDefalut());
    m_sdk.reportAnswer = false;
    EXPECT_FALSE(Send("{}"));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheMetrikWorker, SendLogsEachKindOfException) {
    ASSERT_TRUE(m_worker.InitDefalut());
    ExpectEachKindOfExceptionToBeLogged(m_sdk.reportThrows, "Metrik/MetrikWorker", "Send", 121,
                                        [this] { return Send("{}"); });
}

TEST_F(TheMetrikWorker, TheFailureCallbackLogsBothTexts) {
    ASSERT_TRUE(m_worker.InitDefalut());
    m_sdk.onFailure("upload 100%", "why %s");
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(4, "FailCallBackFun", 21, "upload 100%-why %s")));
}

TEST_F(TheMetrikWorker, TheSuccessCallbackWritesNothing) {
    ASSERT_TRUE(m_worker.InitDefalut());
    m_sdk.onSuccess("a", "b");
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheMetrikWorker, AnAnnouncedModuleHasTheSameCallbacks) {
    ASSERT_TRUE(m_worker.Init(MESSAGE));
    m_sdk.onSuccess("a", "b");
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
    m_sdk.onFailure("a", "b");
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(4, "FailCallBackFun", 21, "a-b")));
}

TEST_F(TheMetrikWorker, AParsersTextIsAFormat) {
    ASSERT_TRUE(m_worker.InitDefalut());
    g_scriptedJson.error = "near %d";
    EXPECT_FALSE(Send("{}"));
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(Record(
                    4, "Send", 107,
                    "[BoostLogError]boost::too_few_args: format-string referred to more arguments than "
                    "were passed")));
    EXPECT_EQ(m_sdk.calls.size(), 1U);
}

TEST_F(TheMetrikWorker, DestructionGivesTheSdkObjectBack) {
    {
        MetrikWorker worker(&m_server);
        ASSERT_TRUE(worker.InitDefalut());
    }
    EXPECT_EQ(m_sdk.created, 1);
    EXPECT_EQ(m_sdk.destroyed, 1);
}
