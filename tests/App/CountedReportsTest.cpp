#include <Poco/Net/DatagramSocket.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "Frame/DBHelper.h"
#include "Ledger/Counts.h"
#include "Ledger/Reader.h"
#include "SystemTool/Platform.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/fakes/FakeSdk.h"
#include "tests/fakes/FakeSqlite.h"
#include "tests/support/WaitUntil.h"

using namespace SyncServiceReport;
using ReportLedger::Outcome;

// What the ledger counts for each kind of datagram.

namespace {

constexpr auto FOR_THE_STORE = R"({"eventID":"B1","value":"v"})";
constexpr auto FOR_ANALYTICS = R"({"eventID":"A759|1","value":{"a":1}})";

class CountedReports : public ::testing::Test {
protected:
    void SetUp() override {
#if defined(__SANITIZE_THREAD__)
        GTEST_SKIP() << "a test changes the fakes beside the running threads; what orders the two is the "
                        "datagram that "
                        "it sends afterwards, which the sanitizer does not see";
#endif
    }

    CountedReports() {
        EXPECT_TRUE(m_server.Start());
    }
    ~CountedReports() override {
        m_server.Stop();
        DBHelper::instance().Init(nullptr);
    }

    /// Sends the datagram, and waits until the service has handled it.
    void Send(const std::string& datagram) {
        const auto before = Counts()[ReportLedger::RECEIVED];
        m_sender.sendTo(datagram.data(), static_cast<int>(datagram.size()),
                        Poco::Net::SocketAddress("127.0.0.1", 9997));
        EXPECT_TRUE(WaitUntil([&] {
            const auto counts = Counts();
            return counts[ReportLedger::RECEIVED] > before && counts[ReportLedger::RECEIVING] == 0 &&
                   ReportLedger::WaitingIn(counts) == 0 && ReportLedger::UnaccountedIn(counts) == 0;
        })) << datagram;
    }

    ReportLedger::Counts Counts() {
        return LookAt(m_server.Ledger().Content(), true, SystemTool::Platform::CoarseTimeMs()).total;
    }

    /// Sends the datagram. Expects that the counter of this outcome grows by one, and no other outcome's.
    void ExpectToEndAs(Outcome outcome, const std::string& datagram) {
        auto expected = Counts();
        Send(datagram);
        ++expected[static_cast<unsigned>(outcome)];
        const auto counts = Counts();
        for (unsigned place = ReportLedger::FIRST_OUTCOME; place <= ReportLedger::LAST_OUTCOME; ++place)
            EXPECT_EQ(counts[place], expected[place]) << "place " << place << " after " << datagram;
    }

    FakeSqliteState& m_db = FakeSqlite();
    FakeSdkState& m_sdk = FakeSdk();
    ReportServer m_server;
    Poco::Net::DatagramSocket m_sender{Poco::Net::SocketAddress("127.0.0.1", 0)};
};

} // namespace

TEST_F(CountedReports, EndInTheStore) {
    ExpectToEndAs(Outcome::Stored, FOR_THE_STORE);
    ExpectToEndAs(Outcome::Stored, R"({"other":"mentions eventID"})");
}

TEST_F(CountedReports, EndAtTheSdk) {
    ExpectToEndAs(Outcome::ToAnalytics, FOR_ANALYTICS);
    ExpectToEndAs(Outcome::ToAnalytics, R"({"eventID":"A759|1"})");
}

TEST_F(CountedReports, AreControlMessagesOfAKnownKindOrAnother) {
    ExpectToEndAs(Outcome::Control, R"({"msgType":"init","exdata":{"moduleID":"A100"}})");
    ExpectToEndAs(Outcome::Control, R"({"msgType":"init","exdata":{"moduleID":"A100"}})");
    ExpectToEndAs(Outcome::Control, R"({"msgType":"updateOpenID","exdata":{"openID":"u1"}})");
    ExpectToEndAs(Outcome::Control, R"({"msgType":"updateOpenID"})");
    ExpectToEndAs(Outcome::OtherControl, R"({"msgType":"Init","exdata":{"moduleID":"A100"}})");
    ExpectToEndAs(Outcome::OtherControl, "{}");
}

TEST_F(CountedReports, AreRefusedBecauseTheyAreNoJson) {
    ExpectToEndAs(Outcome::NotJson, R"({"eventID":)");
    ExpectToEndAs(Outcome::NotJson, "no JSON");
    ExpectToEndAs(Outcome::NotJson, std::string("\0text", 5));
}

TEST_F(CountedReports, AreRefusedByTheStore) {
    m_db.answer = false;
    ExpectToEndAs(Outcome::Store, FOR_THE_STORE);
    m_db.answer = true;
    ExpectToEndAs(Outcome::Stored, FOR_THE_STORE);
}

TEST_F(CountedReports, AreRefusedForWantOfAStore) {
    DBHelper::instance().Init(nullptr);
    ExpectToEndAs(Outcome::NoStore, FOR_THE_STORE);
}

TEST_F(CountedReports, AreRefusedForWhatIsWrongWithAnEvent) {
    ExpectToEndAs(Outcome::ModuleNotInit, R"({"eventID":"A999|1"})");
    ExpectToEndAs(Outcome::EventIdWithoutBar, R"({"eventID":"A759"})");
    ExpectToEndAs(Outcome::ValueNotJson, R"({"eventID":"A759|1","value":"plain text"})");
}

TEST_F(CountedReports, AreRefusedByTheSdk) {
    m_sdk.reportAnswer = false;
    ExpectToEndAs(Outcome::Analytics, FOR_ANALYTICS);
}

TEST_F(CountedReports, AreRefusedForWantOfAnSdk) {
    m_sdk.createsNothing = true;
    ExpectToEndAs(Outcome::Control, R"({"msgType":"init","exdata":{"moduleID":"A100"}})");
    ExpectToEndAs(Outcome::Analytics, R"({"eventID":"A100|1"})");
}

TEST_F(CountedReports, EndWithAnExceptionWhereverItIsThrown) {
    m_db.throws = Throws::Std;
    ExpectToEndAs(Outcome::Exception, FOR_THE_STORE);
    m_sdk.reportThrows = Throws::Poco;
    ExpectToEndAs(Outcome::Exception, FOR_ANALYTICS);
    m_sdk.initThrows = Throws::Other;
    ExpectToEndAs(Outcome::Exception, R"({"msgType":"init","exdata":{"moduleID":"A100"}})");
}

TEST_F(CountedReports, AreCountedWithTheirBytesAsTheyCome) {
    Send("");
    Send(std::string(10240, 'x'));
    Send(std::string(20000, 'x'));
    Send("100%s");
    const auto counts = Counts();
    EXPECT_EQ(counts[ReportLedger::RECEIVED], 4U);
    EXPECT_EQ(counts[ReportLedger::RECEIVED_BYTES], 2U * 10240 + 5) << "what the receiver got of them";
    EXPECT_EQ(counts[ReportLedger::EMPTY], 1U);
    EXPECT_EQ(counts[ReportLedger::AT_SIZE_LIMIT], 2U);
    EXPECT_EQ(counts[ReportLedger::UNFORMATTABLE], 1U);
    EXPECT_LE(counts[ReportLedger::MOST_WAITING], 3U) << "none, when each is handled before the next look";
}

TEST_F(CountedReports, AreAllOfThemUnformattableOrNotWhateverBecomesOfThem) {
    Send(R"({"eventID":"B1","value":"100%% sure"})");
    EXPECT_EQ(Counts()[ReportLedger::UNFORMATTABLE], 0U);
    Send(R"({"eventID":"B1","value":"50%s"})");
    EXPECT_EQ(Counts()[ReportLedger::UNFORMATTABLE], 1U);
    EXPECT_EQ(Counts()[static_cast<unsigned>(Outcome::Stored)], 2U);
}

TEST(CountedInOrder, WhatIsHandledBeforeTheDestinationsAreThereEndsWithAnException) {
    ReportServer server;
    EXPECT_FALSE(server.Consume(FOR_THE_STORE));
    const auto look = LookAt(server.Ledger().Content(), true, 1);
    EXPECT_EQ(look.total[static_cast<unsigned>(Outcome::Exception)], 1U);
}
