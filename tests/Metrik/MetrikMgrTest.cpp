#include "Metrik/MetrikMgr.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/fakes/FakeSdk.h"
#include "tests/support/CaughtExceptions.h"

using namespace SyncServiceReport;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

namespace {

using Call = FakeSdkState::Call;

LogRecord Record(int level, const std::string& function, int line, const std::string& message) {
    return {level, "Metrik/MetrikMgr", function, line, message};
}

class TheMetrikMgr : public ::testing::Test {
protected:
    /// Registers the default module, and drops the record of that.
    void Init() {
        EXPECT_TRUE(m_mgr.Init());
        FakeLogger().Clear();
    }

    bool Send(const std::string& eventID) {
        ST_OptLog log;
        log.eventID = eventID;
        return m_mgr.Send(log);
    }

    /// The ids of the modules that the SDK was started for, in order.
    std::vector<std::string> Started() const {
        std::vector<std::string> modules;
        for (const Call& call : m_sdk.calls)
            if (call.slot == 2)
                modules.push_back(call.arguments.front());
        return modules;
    }

    const ST_BaseInfo& Info() const { return m_server.GetBaseInfo(); }

    /// A manager that lets a test register a worker of its own.
    class Manager : public MetrikMgr {
    public:
        using MetrikMgr::m_mapWorkers;
        using MetrikMgr::MetrikMgr;
    };

    class ThrowingWorker : public IWorker {
    public:
        bool Send(const ST_OptLog&) override {
            ThrowIf(throws);
            return true;
        }
        Throws throws = Throws::Nothing;
    };

    FakeSdkState& m_sdk = FakeSdk();
    ReportServer m_server;
    Manager m_mgr{&m_server};
};

std::string InitMessage(const std::string& moduleID) {
    return R"({"msgType":"init","exdata":{"moduleID":")" + moduleID +
           R"(","moduleVersion":"2.1","moduleName":"Painter","logPath":"/l","dbPath":"/d","openID":"u5",)" +
           R"("hublinkVersion":"5.5"}})";
}

} // namespace

TEST_F(TheMetrikMgr, InitRegistersTheDefaultModule) {
    EXPECT_TRUE(m_mgr.Init());
    EXPECT_THAT(Started(), ElementsAre("A759"));
    EXPECT_EQ(m_sdk.calls.front().arguments[2], "default") << "the worker's own settings, not the empty ones";
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(2, "AddWorker", 41, "Add metrik module :A759")));
    EXPECT_TRUE(Send("A759|1"));
}

TEST_F(TheMetrikMgr, InitIsTrueWhateverTheSdkDoes) {
    m_sdk.createsNothing = true;
    EXPECT_TRUE(m_mgr.Init());
    EXPECT_THAT(FakeLogger().RecordsOf("AddWorker"),
                ElementsAre(Record(2, "AddWorker", 41, "Add metrik module :A759")));
    EXPECT_FALSE(Send("A759|1")) << "registered, but without an SDK";
    EXPECT_THAT(FakeLogger().RecordsOf("Send"), IsEmpty());
}

TEST_F(TheMetrikMgr, AnInitMessageRegistersItsModule) {
    Init();
    EXPECT_TRUE(m_mgr.Update(InitMessage("A100")));
    EXPECT_EQ(m_sdk.calls.back(), (Call{2, 2, {"A100", "2.1", "Painter", "/l", "/d"}}));
    EXPECT_THAT(FakeLogger().RecordsOf("AddWorker"),
                ElementsAre(Record(2, "AddWorker", 41, "Add metrik module :A100")));
    EXPECT_TRUE(Send("A100|1"));
    EXPECT_EQ(m_sdk.calls.back().object, 2);
}

TEST_F(TheMetrikMgr, AnInitMessageUpdatesUserAndVersion) {
    Init();
    EXPECT_TRUE(m_mgr.Update(InitMessage("A100")));
    EXPECT_EQ(Info().openID, "u5");
    EXPECT_EQ(Info().suiteVersion, "5.5");
    EXPECT_EQ(Info().userDataDir, "");
}

TEST_F(TheMetrikMgr, ARepeatedInitChangesNoWorkerButUserAndVersion) {
    Init();
    EXPECT_TRUE(m_mgr.Update(InitMessage("A100")));
    FakeLogger().Clear();
    EXPECT_TRUE(m_mgr.Update(R"({"msgType":"init","exdata":{"moduleID":"A100","moduleName":"Other",)"
                             R"("openID":"u6","hublinkVersion":"6"}})"));
    EXPECT_THAT(Started(), ElementsAre("A759", "A100"));
    EXPECT_THAT(FakeLogger().RecordsOf("AddWorker"), IsEmpty());
    EXPECT_EQ(Info().openID, "u6");
    EXPECT_EQ(Info().suiteVersion, "6");
}

TEST_F(TheMetrikMgr, AnInitOfTheDefaultModuleUsesTheDefaults) {
    EXPECT_TRUE(m_mgr.Update(InitMessage("A759"))); // before Init
    EXPECT_EQ(m_sdk.calls.front().arguments[2], "default");
    EXPECT_TRUE(m_mgr.Init());
    EXPECT_TRUE(m_mgr.Update(InitMessage("A759")));
    EXPECT_THAT(Started(), ElementsAre("A759"));
}

TEST_F(TheMetrikMgr, TheDefaultModulesIdIsCaseSensitive) {
    EXPECT_TRUE(m_mgr.Update(InitMessage("a759")));
    EXPECT_EQ(m_sdk.calls.front().arguments[2], "Painter");
}

TEST_F(TheMetrikMgr, AnInitWithoutItsTextsRegistersTheEmptyModule) {
    Init();
    EXPECT_TRUE(m_mgr.Update(R"({"msgType":"init"})"));
    EXPECT_EQ(m_sdk.calls.back(), (Call{2, 2, {"", "", "", "", ""}}));
    EXPECT_TRUE(m_mgr.Update(R"({"msgType":"init","exdata":{}})"));
    EXPECT_TRUE(m_mgr.Update(R"({"msgType":"init","exdata":[1,2]})"));
    EXPECT_THAT(Started(), ElementsAre("A759", ""));
    EXPECT_EQ(Info().openID, "visitor");
}

TEST_F(TheMetrikMgr, TextsAreReadWhateverTheirType) {
    Init();
    EXPECT_TRUE(
        m_mgr.Update(R"({"msgType":"init","exdata":{"moduleID":100,"moduleVersion":2.5,"moduleName":true,)"
                     R"("logPath":null,"dbPath":{"a":1},"openID":77,"hublinkVersion":5}})"));
    EXPECT_EQ(m_sdk.calls.back(), (Call{2, 2, {"100", "2.5", "true", "", R"({"a":1})"}}));
    EXPECT_EQ(Info().openID, "77");
    EXPECT_EQ(Info().suiteVersion, "5");
}

TEST_F(TheMetrikMgr, AnUpdateOfTheOpenIdTouchesNoWorker) {
    Init();
    EXPECT_TRUE(m_mgr.Update(R"({"msgType":"updateOpenID","exdata":{"openID":"u8","hublinkVersion":"8"}})"));
    EXPECT_EQ(Info().openID, "u8");
    EXPECT_EQ(Info().suiteVersion, "8");
    EXPECT_THAT(Started(), ElementsAre("A759"));
}

TEST_F(TheMetrikMgr, AnUpdateWithoutAVersionKeepsTheVersion) {
    EXPECT_TRUE(m_mgr.Update(R"({"msgType":"updateOpenID","exdata":{"openID":"u8","hublinkVersion":"8"}})"));
    EXPECT_TRUE(m_mgr.Update(R"({"msgType":"updateOpenID","exdata":{"openID":"u9"}})"));
    EXPECT_EQ(Info().openID, "u9");
    EXPECT_EQ(Info().suiteVersion, "8");
}

TEST_F(TheMetrikMgr, AnUpdateWithAnEmptyOpenIdDoesNothing) {
    EXPECT_TRUE(m_mgr.Update(R"({"msgType":"updateOpenID","exdata":{"openID":"","hublinkVersion":"8"}})"));
    EXPECT_EQ(Info().openID, "visitor");
    EXPECT_EQ(Info().suiteVersion, "3.0.0.0");
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheMetrikMgr, OtherKindsOfMessageAreIgnored) {
    for (const std::string text :
         {R"({"msgType":"Init","exdata":{"moduleID":"A1","openID":"u"}})",
          R"({"msgType":"updateopenid","exdata":{"openID":"u"}})", R"({"exdata":{"openID":"u"}})",
          R"({"msgType":["init"]})", "[]", "5", "null"})
        EXPECT_TRUE(m_mgr.Update(text)) << text;
    EXPECT_THAT(m_sdk.calls, IsEmpty());
    EXPECT_EQ(Info().openID, "visitor");
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheMetrikMgr, TextThatIsNoJsonIsLoggedAndChangesNothing) {
    EXPECT_FALSE(m_mgr.Update("%s"));
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(Record(4, "Update", 53, "json formate error :Invalid value. At byte 0.")));
    EXPECT_THAT(m_sdk.calls, IsEmpty());
}

TEST_F(TheMetrikMgr, UpdateLogsEachKindOfExceptionAndTheMapIsAsItWas) {
    ExpectEachKindOfExceptionToBeLogged(m_sdk.initThrows, "Metrik/MetrikMgr", "Update", 93,
                                        [this] { return m_mgr.Update(InitMessage("A100")); });
    FakeLogger().Clear();
    EXPECT_FALSE(Send("A100|1"));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(3, "Send", 115, "module not init :A100")));
    EXPECT_EQ(Info().openID, "visitor") << "the exception came before";
}

TEST_F(TheMetrikMgr, AModuleIsRegisteredThoughTheLineAboutItCannotBeWritten) {
    FakeLogger().onWrite = [](const LogRecord& record) {
        if (record.level == 2)
            throw std::runtime_error("disk full");
    };
    EXPECT_TRUE(m_mgr.Update(InitMessage("A100")));
    FakeLogger().onWrite = nullptr;
    EXPECT_THAT(FakeLogger().RecordsOf("AddWorker"),
                ElementsAre(Record(4, "AddWorker", 41, "[BoostLogError]disk full")));
    EXPECT_EQ(Info().openID, "u5");
    EXPECT_TRUE(Send("A100|1"));
}

TEST_F(TheMetrikMgr, ResultsAreTheSameWhenTheLoggerKeepsThrowing) {
    for (const Throws kind : {Throws::Poco, Throws::Std, Throws::Other}) {
        FakeLogger().throws = kind;
        const std::string module = "A10" + std::to_string(static_cast<int>(kind));
        EXPECT_TRUE(m_mgr.Update(InitMessage(module)));
        EXPECT_TRUE(Send(module + "|1"));
        EXPECT_FALSE(Send("A999|1"));
        EXPECT_FALSE(m_mgr.Update("no JSON"));
    }
    EXPECT_EQ(Info().openID, "u5");
    EXPECT_EQ(Info().suiteVersion, "5.5");
}

TEST_F(TheMetrikMgr, AnExceptionLeavesAddWorker) {
    m_sdk.initThrows = Throws::Std;
    ST_InitMsg msg;
    msg.moduleID = "A100";
    EXPECT_THROW(m_mgr.AddWorker(msg), std::runtime_error);
}

TEST_F(TheMetrikMgr, RoutesByTheTextBeforeTheFirstBar) {
    Init();
    EXPECT_TRUE(m_mgr.Update(InitMessage("A100")));
    EXPECT_TRUE(Send("A100|1|2"));
    EXPECT_EQ(m_sdk.calls.back().object, 2);
    EXPECT_EQ(m_sdk.calls.back().arguments.front(), "A100|1|2");
    EXPECT_TRUE(Send("A759|"));
    EXPECT_EQ(m_sdk.calls.back().object, 1);
}

TEST_F(TheMetrikMgr, AnEventIdWithoutABarIsLoggedWhole) {
    Init();
    EXPECT_FALSE(Send("A759"));
    EXPECT_FALSE(Send(""));
    EXPECT_FALSE(Send("100%s"));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(3, "Send", 107, "eventID error :A759"),
                                                    Record(3, "Send", 107, "eventID error :"),
                                                    Record(3, "Send", 107, "eventID error :100%s")));
}

TEST_F(TheMetrikMgr, AnEventIdThatBeginsWithABarLooksUpTheEmptyModule) {
    Init();
    EXPECT_FALSE(Send("|1"));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(3, "Send", 115, "module not init :")));
    EXPECT_TRUE(m_mgr.Update(R"({"msgType":"init"})"));
    EXPECT_TRUE(Send("|1"));
}

TEST_F(TheMetrikMgr, EventsBeforeTheirModulesInitAreLost) {
    Init();
    EXPECT_FALSE(Send("A100|1"));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(3, "Send", 115, "module not init :A100")));
    EXPECT_TRUE(m_mgr.Update(InitMessage("A100")));
    EXPECT_THAT(Started(), ElementsAre("A759", "A100"));
    EXPECT_EQ(m_sdk.calls.size(), 2U) << "nothing was kept for it, nothing went to the default module";
}

TEST_F(TheMetrikMgr, SendLogsEachKindOfException) {
    Poco::SharedPtr<ThrowingWorker> worker(new ThrowingWorker);
    m_mgr.m_mapWorkers["A1"] = worker;
    ExpectEachKindOfExceptionToBeLogged(worker->throws, "Metrik/MetrikMgr", "Send", 122,
                                        [this] { return Send("A1|1"); });
    EXPECT_TRUE(Send("A1|1"));
}

TEST_F(TheMetrikMgr, TheWorkersAnswerIsTheResult) {
    Init();
    m_sdk.reportAnswer = false;
    EXPECT_FALSE(Send("A759|1"));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheMetrikMgr, WorkersGoWithTheManager) {
    {
        MetrikMgr mgr(&m_server);
        EXPECT_TRUE(mgr.Init());
        EXPECT_TRUE(mgr.Update(InitMessage("A100")));
    }
    EXPECT_EQ(m_sdk.created, 2);
    EXPECT_EQ(m_sdk.destroyed, 2);
}
