#include <filesystem>
#include <fstream>

#include <Poco/Net/ServerSocket.h>
#include <Poco/RegularExpression.h>
#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/Modules/MetrikSdk/support/LoopbackServer.h"
#include "tests/e2e/support/Disk.h"
#include "tests/e2e/support/FileSizeLimit.h"
#include "tests/e2e/support/Service.h"
#include "tests/support/WaitUntil.h"

using ::testing::ElementsAre;
using ::testing::MatchesRegex;

// What is lost when events for analytics cannot be kept or sent, and that the service recovers by itself.

namespace {

using namespace std::chrono_literals;

class OutboxFault : public ::testing::Test {
protected:
    /// An address of the sandbox; each test starts a listener there itself.
    static constexpr auto COLLECTOR = "127.0.0.1:4318";

    void InstallAndStart() {
        m_service.Install();
        m_service.Start();
    }

    void SendEvent() {
        Service::Send(R"({"eventID":"A759|)" + std::to_string(m_sent++) + R"(","value":{"a":1}})");
    }

    /// Sends this many events and waits until they are handled. The store must work.
    void SendEvents(int count) {
        for (int i = 0; i < count; ++i)
            SendEvent();
        m_service.AwaitQuiet();
    }

    /// The messages that the SDK gave to its failure callback.
    std::vector<std::string> Told() const {
        std::vector<std::string> messages;
        for (const auto& line : m_service.LogLines("Metrik/MetrikWorker:21 FailCallBackFun"))
            messages.push_back(line.message);
        return messages;
    }

    bool AwaitTold(std::size_t count) const {
        return WaitUntil([&] { return Told().size() >= count; }, 30s);
    }

    /// Sends one event at a time until one is kept. Expects that each event that was sent is kept, or counted
    /// in the second message.
    void ExpectToGoOnAndToHaveCounted(const std::string& beginning) {
        EXPECT_TRUE(WaitUntil([&] {
            SendEvent();
            return Told().size() == 2;
        }));
        SendEvents(20);
        const Poco::RegularExpression end(
            "^outbox file-Events are stored again; (\\d+) were refused meanwhile$");
        const auto told = Told();
        ASSERT_EQ(told.size(), 2U);
        EXPECT_EQ(told[0], beginning);
        std::vector<std::string> refused;
        ASSERT_EQ(end.split(told[1], refused), 2) << told[1];
        EXPECT_EQ(Waiting() + std::stoi(refused[1]), m_sent);
    }

    std::int64_t Waiting() const {
        return m_service.Count(m_service.OutboxFile(), "select count(*) from event");
    }

    Service m_service;
    int m_sent = 0;
};

} // namespace

TEST_F(OutboxFault, AFullDiskCostsTheEventsThatComeMeanwhileAndSaysHowMany) {
    const Disk disk(m_service.DataDirectory() + "/hublink/database", 2'000'000);
    InstallAndStart();
    SendEvents(20);
    disk.Fill();
    EXPECT_TRUE(WaitUntil([&] {
        SendEvent();
        return !Told().empty();
    }));
    for (int i = 0; i < 100; ++i)
        SendEvent();
    EXPECT_TRUE(WaitUntil(&Service::TookAllDatagrams));
    EXPECT_EQ(Told().size(), 1U) << "and not a hundred times";
    disk.MakeRoom();
    ExpectToGoOnAndToHaveCounted("outbox file-Cannot store an event: database or disk is full");
}

TEST_F(OutboxFault, AFileSizeLimitEndsTheServiceWhenItsLogReachesIt) {
    m_service.Install();
    {
        const FileSizeLimit limit(1'000'000); // the service inherits it
        m_service.Start();
    }
    for (int i = 0; i < 300; ++i)
        Service::Send(R"({"eventID":"A759|1","value":{"a":")" + std::string(9'000, 'x') + "\"}}");
    EXPECT_EQ(m_service.AwaitEnd(), -SIGXFSZ);
    EXPECT_LE(std::filesystem::file_size(m_service.OutboxFile() + "-wal"), 1'000'000U);
    EXPECT_GT(std::filesystem::file_size(m_service.OutboxFile() + "-wal"), 900'000U);
}

TEST_F(OutboxFault, ALockHeldForMoreThanFiveSecondsCostsTheEventsThatComeAfterThem) {
    InstallAndStart();
    SendEvents(20);
    SQLite::Database other(m_service.OutboxFile(), SQLite::OPEN_READWRITE);
    other.exec("begin immediate");
    const auto begin = std::chrono::steady_clock::now();
    for (int i = 0; i < 20; ++i)
        SendEvent();
    ASSERT_TRUE(AwaitTold(1));
    EXPECT_GE(std::chrono::steady_clock::now() - begin, 4900ms);
    m_service.AwaitQuiet(); // the other events are refused at once
    EXPECT_LT(std::chrono::steady_clock::now() - begin, 10s);
    other.exec("commit");
    ExpectToGoOnAndToHaveCounted("outbox file-Cannot store an event: database is locked");
}

TEST_F(OutboxFault, ADeletedOutboxCostsWhatWaitedInIt) {
    InstallAndStart();
    SendEvents(20);
    for (const std::string suffix : {"", "-wal", "-shm"})
        std::filesystem::remove(m_service.OutboxFile() + suffix);
    SendEvents(20);
    EXPECT_EQ(Waiting(), 20) << "those that came after";
    EXPECT_THAT(Told(), ElementsAre("outbox vanished-" + m_service.OutboxFile() +
                                    " was deleted or replaced, with all events that waited in it"));
}

TEST_F(OutboxFault, ADamagedOutboxIsSetAsideAndAnotherBegun) {
    InstallAndStart();
    SendEvents(200);
    m_service.Query(m_service.OutboxFile(), "pragma wal_checkpoint(truncate)");
    const auto size = std::filesystem::file_size(m_service.OutboxFile());
    std::filesystem::resize_file(m_service.OutboxFile(), 0);
    std::ofstream(m_service.OutboxFile(), std::ios::app) << std::string(size, 'x');
    SendEvents(20);
    EXPECT_EQ(Waiting(), 20) << "those that came after";
    EXPECT_THAT(Told(),
                ElementsAre(MatchesRegex(
                    "outbox damaged-Cannot store an event: file is not a database; the file was set aside as "
                    ".*/MetrikOutbox.db.damaged-.*")));
}

TEST_F(OutboxFault, ACollectorThatIsAwayCostsNothingAndIsToldOnce) {
    m_service.SetEnvironment(std::string("OTEL_EXPORTER_OTLP_ENDPOINT=http://") + COLLECTOR);
    InstallAndStart();
    SendEvents(100);
    ASSERT_TRUE(AwaitTold(1));
    SendEvents(100);
    EXPECT_EQ(Waiting(), 200);
    EXPECT_THAT(Told(),
                ElementsAre(MatchesRegex("upload-http://127.0.0.1:4318/v1/logs: .*[Cc]onnect.*; the events "
                                         "stay in the outbox")));
}

TEST_F(OutboxFault, ACollectorThatComesBackGetsEveryEvent) {
    m_service.SetEnvironment(std::string("OTEL_EXPORTER_OTLP_ENDPOINT=http://") + COLLECTOR);
    InstallAndStart();
    SendEvents(100);
    ASSERT_TRUE(AwaitTold(1));
    const LoopbackServer collector([](const Request&) { return Reply(); },
                                   Poco::Net::ServerSocket(Poco::Net::SocketAddress(COLLECTOR)));
    SendEvents(100);
    EXPECT_TRUE(WaitUntil([&] { return Waiting() == 0; }, 60s));
    EXPECT_THAT(m_service.Query(m_service.OutboxFile(), "select stored, delivered from outbox_status"),
                ElementsAre("200|200"));
    ASSERT_EQ(Told().size(), 2U);
    EXPECT_EQ(Told()[1], "upload-http://127.0.0.1:4318/v1/logs: events are taken again");
}
