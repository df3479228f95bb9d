#include "Tools/reportctl/log/Outcomes.h"

#include <algorithm>

#include <fmt/format.h>
#include <gmock/gmock.h>

#include "tests/Tools/reportctl/support/OutboxFile.h"
#include "tests/Tools/reportctl/support/RowsFixture.h"

namespace {

using reportctl::log::Outcomes;
using reportctl::log::Pairing;
using reportctl::log::Survey;
using ::testing::ElementsAre;

/// Lines of a service beside its databases.
class LogOutcomes : public RowsFixture {
protected:
    void SetUp() override {
        RowsFixture::SetUp();
        MakeOutbox(Outbox());
        AtOutbox(Outbox(), "delete from event; delete from dead_letter; update module set last_sequence = 0");
    }

    std::string Outbox() const { return Database() + "/MetrikOutbox.db"; }

    static void AtOutbox(const std::string& path, const std::string& sql) {
        SQLite::Database(path, SQLite::OPEN_READWRITE).exec(sql);
    }

    /// What the service does with an event: it counts it, and keeps it until it is delivered.
    static void Store(const std::string& outbox, int number, bool isDelivered) {
        AtOutbox(outbox, "update module set last_sequence = last_sequence + 1");
        if (!isDelivered)
            AtOutbox(outbox,
                     fmt::format("insert into event(uuid, module, release, sequence, event_id, payload, "
                                 "stored_ms, bytes) select 'u' || {0}, 1, 1, last_sequence, 'A100|{0}', "
                                 "'{{\"eventData\":{{\"openid\":\"u1\",\"sys_version\":\"9\"}},"
                                 "\"extend\":{{\"createTime\":\"1700000000000\"}}}}', 0, 1 from module",
                                 number));
    }

    void Arrive(const std::string& text) {
        m_pairing.Take({.time = {},
                        .stamp = {},
                        .level = 2,
                        .process = "1",
                        .site = "App/ReportServer",
                        .number = {},
                        .function = "Recv",
                        .message = text});
    }
    void ArriveEvent(int number) {
        Arrive(fmt::format(R"({{"eventID":"A100|{}","value":"","createTime":1700000000}})", number));
    }
    void ArriveReport(const std::string& value) {
        Arrive(fmt::format(R"({{"eventID":"B1","value":"{}","createTime":1700000000}})", value));
    }

    /// As a command does at its start.
    void Begin() {
        Survey survey;
        for (const auto& entry : m_pairing.Entries())
            survey.Add(entry);
        m_outcomes.Begin(survey);
        m_outcomes.Resolve(m_pairing, survey.entries);
    }

    void GoOn() {
        m_outcomes.ReadNew();
        m_outcomes.Resolve(m_pairing, 0);
    }

    std::vector<std::string> Words() {
        std::vector<std::string> words;
        for (const auto& entry : m_pairing.Entries())
            words.emplace_back(WordFor(entry.outcome));
        return words;
    }

    Pairing m_pairing;
    Outcomes m_outcomes{RowsFixture::Store(), Outbox()};
};

TEST_F(LogOutcomes, FindARowForEachOfTwoEqualReports) {
    ArriveReport("one");
    ArriveReport("one");
    ArriveReport("it''s");
    Insert("'B1'", "'one'", "'1700000000000'");
    Insert("'B1'", "'it''s'", "'1700000000000'");
    Begin();
    EXPECT_THAT(Words(), ElementsAre("stored", "unknown", "stored"));
    Insert("'B1'", "'one'", "'1700000000000'");
    GoOn();
    EXPECT_THAT(Words(), ElementsAre("stored", "stored", "stored"));
}

TEST_F(LogOutcomes, FindAnEventThatWaitsAndCountOneThatWasDelivered) {
    ArriveEvent(1);
    ArriveEvent(2);
    Store(Outbox(), 1, true);
    Store(Outbox(), 2, false);
    Begin();
    EXPECT_THAT(Words(), ElementsAre("toAnalytics", "toAnalytics"));
    ArriveEvent(3);
    Store(Outbox(), 3, true);
    GoOn();
    EXPECT_THAT(Words(), ElementsAre("toAnalytics", "toAnalytics", "toAnalytics"));
}

TEST_F(LogOutcomes, StayUnknownWhereAnEventMayBeMissing) {
    ArriveEvent(1);
    ArriveEvent(2);
    Store(Outbox(), 1, true);
    Begin();
    EXPECT_THAT(Words(), ElementsAre("unknown", "unknown"));
}

TEST_F(LogOutcomes, LookIntoTheOutboxThatAModuleAnnounced) {
    const auto directory = Data() + "/of-the-module";
    std::filesystem::create_directory(directory);
    MakeOutbox(directory + "/MetrikOutbox.db");
    AtOutbox(directory + "/MetrikOutbox.db", "delete from event; update module set last_sequence = 0");
    const auto init = R"({"msgType":"init","exdata":{"moduleID":"A100","dbPath":")" + directory + R"("}})";
    const auto outbox = directory + "/MetrikOutbox.db";

    ::setenv("XDG_DATA_HOME", Data().c_str(), 1); // below which such a directory may be
    Arrive(init);
    ArriveEvent(1);
    ArriveEvent(2);
    Store(outbox, 1, false);
    Store(outbox, 2, true);
    Begin();
    EXPECT_THAT(Words(), ElementsAre("control", "toAnalytics", "toAnalytics"));
    EXPECT_THAT(m_outcomes.OutboxFiles(), ElementsAre(Outbox(), outbox));
    ArriveEvent(3);
    Store(outbox, 3, true);
    GoOn();
    EXPECT_THAT(Words(), ElementsAre("control", "toAnalytics", "toAnalytics", "toAnalytics"));
}

TEST_F(LogOutcomes, DoNotLookIntoADirectoryThatAnotherUserMayWriteTo) {
    const auto directory = Data() + "/of-all";
    std::filesystem::create_directory(directory);
    MakeOutbox(directory + "/MetrikOutbox.db");
    std::filesystem::permissions(directory, std::filesystem::perms(0777));
    ::setenv("XDG_DATA_HOME", Data().c_str(), 1);
    Arrive(R"({"msgType":"init","exdata":{"moduleID":"A100","dbPath":")" + directory + R"("}})");
    Begin();
    EXPECT_THAT(m_outcomes.OutboxFiles(), ElementsAre(Outbox()));
}

} // namespace
