#include "App/ReportServer.h"

#include <filesystem>
#include <memory>
#include <thread>

#include <Poco/Event.h>
#include <Poco/Net/DatagramSocket.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Frame/DBHelper.h"
#include "Frame/FrameWorker.h"
#include "Metrik/MetrikMgr.h"
#include "SystemTool/CommonTool.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/fakes/FakeSdk.h"
#include "tests/fakes/FakeSqlite.h"
#include "tests/support/CapturedOutput.h"
#include "tests/support/CaughtExceptions.h"
#include "tests/support/OtherThread.h"
#include "tests/support/ScriptedManager.h"
#include "tests/support/WaitUntil.h"

using namespace SyncServiceReport;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace {

constexpr auto TOO_FEW_ARGUMENTS =
    "[BoostLogError]boost::too_few_args: format-string referred to more arguments than were passed";

LogRecord Record(int level, const std::string& function, int line, const std::string& message) {
    return {level, "App/ReportServer", function, line, message};
}

class TheReportServer : public ::testing::Test {
protected:
    ~TheReportServer() override {
        m_server.Stop();
        DBHelper::instance().Init(nullptr);
    }

    void Start() {
        ASSERT_TRUE(m_server.Start());
        FakeLogger().Clear();
    }

    static void SendDatagram(const std::string& text) {
        Poco::Net::DatagramSocket sender(Poco::Net::SocketAddress("127.0.0.1", 0));
        sender.sendTo(text.data(), static_cast<int>(text.size()),
                      Poco::Net::SocketAddress("127.0.0.1", 9997));
    }

    /// The last message of a test. When its effect is seen, everything that was sent before it has been
    /// handled.
    static constexpr auto THE_END = R"({"msgType":"updateOpenID","exdata":{"openID":"the end"}})";

    void AwaitTheEnd() {
        EXPECT_TRUE(WaitUntil([] { return FakeLogger().RecordsOf("SetBaseInfo").size() == 1; }));
        m_server.Stop();
    }

    std::size_t EventCount() const { return m_sdk.calls.size() - 1; } // the first call is the initialisation
    // The first two calls open the file and read BaseInfo.
    std::size_t RowCount() const { return m_db.calls.size() - 2; }

    FakeSqliteState& m_db = FakeSqlite();
    FakeSdkState& m_sdk = FakeSdk();
    ReportServer m_server;
};

/// A server whose consumer keeps its first text until the test releases it.
class BlockedServer final : public ReportServer {
public:
    ~BlockedServer() override { m_release.set(), Stop(); }

    bool Consume(const std::string&) override {
        m_entered.set();
        m_release.wait();
        return true;
    }

    Poco::Event m_entered;
    Poco::Event m_release{Poco::Event::EVENT_MANUALRESET};
};

/// The number of threads of this process. A sanitizer starts a thread of its own with the program's first
/// thread, so this starts one before it counts.
std::ptrdiff_t ThreadCount() {
    std::thread([] {}).join();
    return std::distance(std::filesystem::directory_iterator("/proc/self/task"), {});
}

} // namespace

// --- start and stop

TEST_F(TheReportServer, StartBringsUpTheDestinationsInOrder) {
    EXPECT_TRUE(m_server.Start());
    EXPECT_EQ(m_server.GetBaseInfo().userDataDir, SystemTool::CommonTool::GetUserDataDir());
    EXPECT_EQ(m_server.GetBaseInfo().osVersion, SystemTool::CommonTool::GetOSVersionString());
    EXPECT_THAT(m_sdk.calls.front().arguments[3], HasSubstr(SystemTool::CommonTool::GetUserDataDir()));
    std::vector<std::string> messages;
    for (const auto& record : FakeLogger().Records())
        messages.push_back(record.message);
    EXPECT_THAT(messages, ElementsAre("Add metrik module :A759", "FrameWorker load success"));
}

TEST_F(TheReportServer, StartReceivesOnTheReportPortAndConsumes) {
    Start();
    SendDatagram(R"({"eventID":"B1","value":"v"})");
    SendDatagram(R"({"eventID":"A759|1"})");
    SendDatagram(THE_END);
    AwaitTheEnd();
    EXPECT_EQ(RowCount(), 1U);
    EXPECT_EQ(EventCount(), 1U);
}

TEST_F(TheReportServer, StartIsTrueWhenNothingWorks) {
    m_db.createsNothing = true;
    m_sdk.createsNothing = true;
    Poco::Net::DatagramSocket taken;
    taken.bind(Poco::Net::SocketAddress("127.0.0.1", 9997), false, false);
    CapturedOutput output;
    EXPECT_TRUE(m_server.Start());
    EXPECT_EQ(output.Text(), "Poco exception: Net Exception: Address already in use: 127.0.0.1:9997\n");
}

TEST_F(TheReportServer, AnExceptionInStartIsLogged) {
    Start();
    CapturedOutput output; // captures the socket's error about a second bind
    EXPECT_FALSE(m_server.Start()) << "a thread that runs cannot be started";
    const auto records = FakeLogger().RecordsOf("Start");
    ASSERT_EQ(records.size(), 1U);
    EXPECT_EQ(records[0], Record(3, "Start", 35, records[0].message));
    EXPECT_THAT(records[0].message, ::testing::MatchesRegex("Poco exception :.*thread already running.* "));
}

TEST_F(TheReportServer, StartLogsEachKindOfException) {
    ExpectEachKindOfExceptionToBeLogged(g_managerThrows, "App/ReportServer", "Start", 35,
                                        [this] { return m_server.Start(); });
}

TEST_F(TheReportServer, AfterAnExceptionInStartReportsAreStillStored) {
    Start();
    CapturedOutput output;
    EXPECT_FALSE(m_server.Start());
    FakeLogger().Clear();
    SendDatagram(R"({"eventID":"after"})");
    SendDatagram(THE_END);
    AwaitTheEnd();
    EXPECT_THAT(m_db.calls.back().argument, HasSubstr("'after'"));
}

TEST_F(TheReportServer, DestructionStopsBothThreadsFirst) {
    const auto before = ThreadCount();
    {
        ReportServer server;
        ASSERT_TRUE(server.Start());
        for (int i = 0; i < 100; ++i)
            server.Recv(R"({"eventID":"B1"})");
        EXPECT_TRUE(WaitUntil([&] { return ThreadCount() == before + 2; }));
    }
    EXPECT_TRUE(WaitUntil([&] { return ThreadCount() == before; }));
}

TEST_F(TheReportServer, StopEndsTheInputBeforeTheQueue) {
    BlockedServer server;
    const auto before = ThreadCount();
    ASSERT_TRUE(server.Start());
    server.Recv("any");
    server.m_entered.wait(); // now the consumer handles the text, until it is released
    Poco::Thread stopper;
    stopper.startFunc([&server] { server.Stop(); });
    // When the receiver's thread has ended, two more than before are left: the consumer's and the stopper's.
    EXPECT_TRUE(WaitUntil([&] { return ThreadCount() == before + 2; }, std::chrono::seconds(5)));
    server.m_release.set();
    stopper.join();
    EXPECT_TRUE(WaitUntil([&] { return ThreadCount() == before; }));
}

TEST_F(TheReportServer, DestructionKeepsTheDestinationsUntilTheReportUnderWayIsStored) {
    auto server = std::make_unique<ReportServer>();
    const auto before = ThreadCount();
    ASSERT_TRUE(server->Start());
    Poco::Event entered;
    Poco::Event release;
    m_db.onExec = [&] {
        entered.set();
        release.wait();
    };
    server->Recv(R"({"eventID":"B1"})");
    entered.wait();
    OtherThread destroyer([&] { server.reset(); });
    // When the receiver's thread has ended, two more than before are left: the consumer's and the
    // destroyer's.
    EXPECT_TRUE(WaitUntil([&] { return ThreadCount() == before + 2; }, std::chrono::seconds(5)));
    EXPECT_TRUE(destroyer.Waits());
    EXPECT_EQ(m_db.destroyed, 0);
    EXPECT_EQ(m_sdk.destroyed, 0);
    release.set();
}

TEST_F(TheReportServer, TheStoreIsReleasedBeforeAnalytics) {
    int sequence = 0;
    m_db.sequence = &sequence;
    m_sdk.sequence = &sequence;
    {
        ReportServer server;
        ASSERT_TRUE(server.Start());
    }
    EXPECT_EQ(m_db.destroyedAt, 1);
    EXPECT_EQ(m_sdk.destroyedAt, 2);
}

TEST_F(TheReportServer, StopBeforeStartReturns) {
    m_server.Stop();
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheReportServer, DestructionReleasesTheDestinations) {
    {
        ReportServer server;
        ASSERT_TRUE(server.Start());
    }
    EXPECT_EQ(m_sdk.destroyed, 1);
    EXPECT_EQ(m_db.destroyed, 1);
}

TEST_F(TheReportServer, WhatIsReceivedIsHandledInOrder) {
    Start();
    for (int i = 0; i < 500; ++i)
        SendDatagram(R"({"eventID":"B)" + std::to_string(i) + "\"}");
    SendDatagram(THE_END);
    AwaitTheEnd();
    ASSERT_EQ(RowCount(), 500U);
    for (int i = 0; i < 500; ++i)
        EXPECT_THAT(m_db.calls[static_cast<std::size_t>(i) + 2].argument,
                    HasSubstr("'B" + std::to_string(i) + "'"));
}

// --- receiving

TEST_F(TheReportServer, RecvLogsTheTextAndIsTrue) {
    EXPECT_TRUE(m_server.Recv(R"({"eventID":"B1"})"));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(2, "Recv", 42, R"({"eventID":"B1"})")));
}

TEST_F(TheReportServer, RecvLogsBeforeItQueues) {
    class Server : public ReportServer {
    public:
        using PocoTasker<std::string>::m_queue;
    } server;
    int waiting = -1;
    FakeLogger().onWrite = [&](const LogRecord&) { waiting = server.m_queue.size(); };
    server.Recv("text");
    FakeLogger().onWrite = nullptr;
    EXPECT_EQ(waiting, 0);
    EXPECT_EQ(server.m_queue.size(), 1);
}

TEST_F(TheReportServer, RecvTakesTheTextForAFormat) {
    EXPECT_TRUE(m_server.Recv("%s"));
    EXPECT_TRUE(m_server.Recv("100%% sure"));
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(Record(4, "Recv", 42, TOO_FEW_ARGUMENTS), Record(2, "Recv", 42, "100% sure")));
}

TEST_F(TheReportServer, ATextThatCannotBeLoggedIsProcessedAllTheSame) {
    Start();
    SendDatagram(R"({"eventID":"B1","value":"50%s"})");
    SendDatagram("%s");
    SendDatagram(THE_END);
    AwaitTheEnd();
    EXPECT_EQ(RowCount(), 1U);
    EXPECT_THAT(m_db.calls.back().argument, HasSubstr("'50%s'"));
    EXPECT_EQ(FakeLogger().RecordsOf("Recv")[0], Record(4, "Recv", 42, TOO_FEW_ARGUMENTS));
    EXPECT_EQ(FakeLogger().RecordsOf("Update")[0].message, "json formate error :Invalid value. At byte 0.");
}

// --- dispatch

TEST_F(TheReportServer, AReportOfAModuleGoesToAnalyticsOnly) {
    Start();
    EXPECT_TRUE(m_server.Consume(R"({"eventID":"A759|10001","value":{"a":1},"createTime":1700000000})"));
    EXPECT_EQ(EventCount(), 1U);
    EXPECT_EQ(RowCount(), 0U);
    EXPECT_EQ(m_sdk.calls.back().arguments.front(), "A759|10001");
    EXPECT_THAT(m_sdk.calls.back().arguments.back(), HasSubstr(R"("createTime":"1700000000000")"));
}

TEST_F(TheReportServer, AnyOtherReportGoesToTheStoreOnly) {
    Start();
    for (const std::string eventID : {"B1", "a759|1", "", "|A", " A", "1"})
        EXPECT_TRUE(m_server.Consume(R"({"eventID":")" + eventID + "\"}")) << eventID;
    EXPECT_EQ(EventCount(), 0U);
    EXPECT_EQ(RowCount(), 6U);
}

TEST_F(TheReportServer, TheFirstLetterIsThatOfTheDecodedId) {
    Start();
    EXPECT_TRUE(m_server.Consume(R"({"eventID":"\u0041759|1"})"));
    EXPECT_EQ(EventCount(), 1U);
}

TEST_F(TheReportServer, TheKeyIsSearchedInTheRawText) {
    Start();
    EXPECT_TRUE(m_server.Consume(R"({"event\u0049D":"B1"})")) << "an escaped spelling of the key is none";
    EXPECT_EQ(RowCount(), 0U);
    EXPECT_TRUE(m_server.Consume(R"({"other":"mentions eventID"})"));
    EXPECT_EQ(RowCount(), 1U) << "a report with an empty id";
    EXPECT_THAT(m_db.calls.back().argument, HasSubstr("values('', '','',1,"));
}

TEST_F(TheReportServer, AControlMessageThatMentionsTheKeyIsNoControlMessage) {
    Start();
    EXPECT_TRUE(m_server.Consume(R"({"msgType":"updateOpenID","exdata":{"openID":"eventID"}})"));
    EXPECT_EQ(m_server.GetBaseInfo().openID, "visitor");
    EXPECT_EQ(RowCount(), 1U);
}

TEST_F(TheReportServer, AControlMessageGoesToTheManagerAndIsTrueWhateverItSays) {
    Start();
    EXPECT_TRUE(m_server.Consume(R"({"msgType":"updateOpenID","exdata":{"openID":"u1"}})"));
    EXPECT_EQ(m_server.GetBaseInfo().openID, "u1");
    EXPECT_TRUE(m_server.Consume("no JSON"));
    EXPECT_TRUE(m_server.Consume(""));
    EXPECT_EQ(FakeLogger().RecordsOf("Update").size(), 2U);
}

TEST_F(TheReportServer, AReportThatCannotBeParsedIsFalseAndTheNextOneIsTaken) {
    Start();
    EXPECT_FALSE(m_server.Consume(R"({"eventID":)"));
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(Record(4, "JsonToStruct", 123, "Invalid value. At byte 11.")));
    EXPECT_TRUE(m_server.Consume(R"({"eventID":"B1"})"));
    EXPECT_EQ(RowCount(), 1U);
}

TEST_F(TheReportServer, ADestinationsFailureIsNoFailureOfConsume) {
    Start();
    m_db.answer = false;
    m_sdk.reportAnswer = false;
    EXPECT_TRUE(m_server.Consume(R"({"eventID":"B1"})"));
    EXPECT_TRUE(m_server.Consume(R"({"eventID":"A759|1"})"));
}

TEST_F(TheReportServer, AMissingDestinationIsLogged) {
    EXPECT_FALSE(m_server.Consume(R"({"eventID":"B1"})"));
    EXPECT_FALSE(m_server.Consume(R"({"eventID":"A1"})"));
    EXPECT_FALSE(m_server.Consume("control"));
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(Record(3, "Consume", 76, "Poco exception :Null pointer "),
                            Record(3, "Consume", 76, "Poco exception :Null pointer "),
                            Record(3, "Consume", 76, "Poco exception :Null pointer ")));
}

TEST_F(TheReportServer, ConsumeLogsEachKindOfExceptionAndTakesTheNextText) {
    Start();
    ExpectEachKindOfExceptionToBeLogged(g_managerThrows, "App/ReportServer", "Consume", 76,
                                        [this] { return m_server.Consume("control"); });
    EXPECT_TRUE(m_server.Consume(R"({"eventID":"B1"})"));
    EXPECT_EQ(RowCount(), 1U);
}

// --- base information

TEST_F(TheReportServer, SetBaseInfoTakesUserAndVersionOverAndLogsThem) {
    ST_BaseInfo info;
    info.openID = "u1";
    info.suiteVersion = "5.1.0.2";
    m_server.SetBaseInfo(info);
    EXPECT_EQ(m_server.GetBaseInfo().openID, "u1");
    EXPECT_EQ(m_server.GetBaseInfo().suiteVersion, "5.1.0.2");
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(Record(2, "SetBaseInfo", 111, "SetBaseInfo u1-5.1.0.2")));
}

TEST_F(TheReportServer, SetBaseInfoWithBothEmptyChangesNothingAndLogs) {
    ST_BaseInfo info;
    info.openID.clear();
    info.suiteVersion.clear();
    m_server.SetBaseInfo(info);
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(Record(2, "SetBaseInfo", 111, "SetBaseInfo visitor-3.0.0.0")));
}

TEST_F(TheReportServer, SetBaseInfoWithAnEmptyVersionKeepsTheVersion) {
    ST_BaseInfo info;
    info.suiteVersion = "9";
    m_server.SetBaseInfo(info);
    info.openID = "u1";
    info.suiteVersion.clear();
    m_server.SetBaseInfo(info);
    EXPECT_EQ(FakeLogger().Records().back().message, "SetBaseInfo u1-9");
}

TEST_F(TheReportServer, AFreshRecordPassesItsOtherDefaultOn) {
    ST_BaseInfo info;
    info.suiteVersion = "9";
    m_server.SetBaseInfo(info);
    ST_BaseInfo fresh;
    fresh.openID = "u1";
    m_server.SetBaseInfo(fresh);
    EXPECT_EQ(m_server.GetBaseInfo().suiteVersion, "3.0.0.0");
}

TEST_F(TheReportServer, SetBaseInfoNeverChangesTheMachinesFacts) {
    m_server.InitBaseInfo();
    ST_BaseInfo info;
    info.userDataDir = "/elsewhere";
    info.osVersion = "other";
    m_server.SetBaseInfo(info);
    EXPECT_EQ(m_server.GetBaseInfo().userDataDir, SystemTool::CommonTool::GetUserDataDir());
    EXPECT_EQ(m_server.GetBaseInfo().osVersion, SystemTool::CommonTool::GetOSVersionString());
}

TEST_F(TheReportServer, InitBaseInfoLeavesUserAndVersionAlone) {
    ST_BaseInfo info;
    info.openID = "u1";
    info.suiteVersion = "9";
    m_server.SetBaseInfo(info);
    m_server.InitBaseInfo();
    EXPECT_EQ(m_server.GetBaseInfo().openID, "u1");
    EXPECT_EQ(m_server.GetBaseInfo().suiteVersion, "9");
}

TEST_F(TheReportServer, AnOpenIdWithAPercentSignIsLoggedUnchanged) {
    ST_BaseInfo info;
    info.openID = "100%s";
    m_server.SetBaseInfo(info);
    EXPECT_EQ(FakeLogger().Records().back(), Record(2, "SetBaseInfo", 111, "SetBaseInfo 100%s-3.0.0.0"));
}
