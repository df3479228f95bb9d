#include <gmock/gmock.h>

#include "SystemTool/IO/JsonDocument.h"
#include "tests/Modules/MetrikSdk/support/LoopbackServer.h"
#include "tests/Tools/reportctl/support/OutboxFile.h"
#include "tests/Tools/reportctl/support/ReportctlFixture.h"

namespace {

using ::testing::HasSubstr;

class OutboxCommand : public ReportctlFixture {
protected:
    void SetUp() override {
        std::filesystem::create_directories(Database());
        MakeOutbox(Path());
    }

    std::string Path() const { return Database() + "/MetrikOutbox.db"; }

    std::string AskOutbox(const std::string& query) const {
        SQLite::Database database(Path(), SQLite::OPEN_READWRITE);
        return database.execAndGet(query).getString();
    }

    std::string Status() const {
        return AskOutbox(
            "select stored || ' ' || waiting || ' ' || waiting_bytes || ' ' || dead_lettered || ' ' || "
            "dead_letters || ' ' || dead_letter_bytes from outbox_status");
    }

    static std::string EventsOfModule() {
        return "select group_concat(uuid || '=' || sequence, ' ') from (select * from event order by id)";
    }
};

TEST_F(OutboxCommand, ListsWhatWaitsAndWhatWasRefused) {
    const auto outcome = Reportctl("outbox list", "TZ=UTC");
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_EQ(outcome.output,
              "u-3  waiting  2023-11-14 22:13:20.000      100 B  A100|3\n"
              "u-1  dead     2023-11-14 22:13:20.000      100 B  A100|1  -> 400: too odd\n"
              "u-2  dead     2023-11-14 22:13:20.000      100 B  A100|2  -> 413: \\x1b[31mred\n");
}

TEST_F(OutboxCommand, ListsAsJson) {
    EXPECT_EQ(Reportctl("outbox list --dead --json", "TZ=UTC").output,
              R"([{"id":"u-1","module":"A100","sequence":1,"eventID":"A100|1",)"
              R"("storedAt":"2023-11-14T22:13:20.000+00:00","bytes":100,)"
              R"("state":"dead","status":400,"reason":"too odd"},)"
              "\n"
              R"({"id":"u-2","module":"A100","sequence":2,"eventID":"A100|2",)"
              R"("storedAt":"2023-11-14T22:13:20.000+00:00","bytes":100,)"
              R"("state":"dead","status":413,"reason":"\u001B[31mred"}])"
              "\n");
    Reportctl("outbox purge --dead");
    EXPECT_EQ(Reportctl("outbox list --dead --json").output, "[]\n");
}

TEST_F(OutboxCommand, ListsNothingWhileTheServiceHasMadeNoOutbox) {
    std::filesystem::remove_all(Database());
    std::filesystem::create_directories(Database());
    const auto json = Reportctl("outbox list --json");
    EXPECT_EQ(json.exitCode, 0);
    EXPECT_EQ(json.output, "[]\n");
    const auto text = Reportctl("outbox list");
    EXPECT_EQ(text.exitCode, 0);
    EXPECT_EQ(text.output, "nothing waits, and there are no dead letters: there is no outbox yet\n");
    EXPECT_EQ(Reportctl("outbox retry --all").exitCode, 1);
}

TEST_F(OutboxCommand, PutsDeadLettersBackUnderTheirIdsAndNewSequenceNumbers) {
    const auto outcome = Reportctl("outbox retry --all");
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_EQ(outcome.output, "2 put back\n");
    EXPECT_EQ(AskOutbox(EventsOfModule()), "u-3=3 u-1=4 u-2=5");
    EXPECT_EQ(Status(), "5 3 300 2 0 0");
    EXPECT_EQ(AskOutbox("select payload from event where uuid = 'u-1'"), "{\"a\":1}");
    EXPECT_EQ(AskOutbox("select abs(stored_ms / 1000 - unixepoch()) < 60 from event where uuid = 'u-1'"),
              "1");
    EXPECT_EQ(Reportctl("outbox retry --all").output, "0 put back\n");
}

TEST_F(OutboxCommand, PutsBackTheOnesThatAreNamed) {
    const auto outcome = Reportctl("outbox retry u-2 u-9");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says("1 put back")) << outcome.output;
    EXPECT_TRUE(outcome.Says("error: no dead letter has the id u-9")) << outcome.output;
    EXPECT_EQ(AskOutbox(EventsOfModule()), "u-3=3 u-2=4");
    EXPECT_EQ(Status(), "4 2 200 2 1 100");
}

TEST_F(OutboxCommand, DeletesDeadLettersWhenItIsAskedTo) {
    EXPECT_GE(Reportctl("outbox purge").exitCode, 100);
    EXPECT_EQ(AskOutbox("select count(*) from dead_letter"), "2");
    EXPECT_EQ(Reportctl("outbox purge --dead").output, "2 deleted\n");
    EXPECT_EQ(Status(), "3 1 100 2 0 0");
}

TEST_F(OutboxCommand, ChangesNothingWhileItLooks) {
    Reportctl("outbox list"); // opening it for the first time may change files
    const auto before = Everything();
    Reportctl("outbox list --json");
    EXPECT_TRUE(Everything() == before);
}

TEST_F(OutboxCommand, SaysWhatIsWrongWithTheFile) {
    SQLite::Database(Path(), SQLite::OPEN_READWRITE).exec("pragma user_version = 77");
    const auto odd = Reportctl("outbox retry --all");
    EXPECT_EQ(odd.exitCode, 1);
    EXPECT_TRUE(odd.Says("is no outbox of schema version")) << odd.output;
    const auto missing = Reportctl("outbox list --file '" + Data() + "/none.db'");
    EXPECT_EQ(missing.exitCode, 1);
    EXPECT_TRUE(missing.Says("there is no outbox")) << missing.output;
    EXPECT_FALSE(std::filesystem::exists(Data() + "/none.db"));
}

TEST_F(OutboxCommand, SendsATestEventAndTellsTheAnswer) {
    LoopbackServer collector(
        [](const Request&) { return Reply{.status = 200, .body = "{\"ok\":1}", .headers = {}}; });
    const auto outcome =
        Reportctl("outbox test",
                  "OTEL_EXPORTER_OTLP_HEADERS=key=secret OTEL_EXPORTER_OTLP_ENDPOINT=" + collector.Url());
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_THAT(outcome.output, HasSubstr("name resolution: 127.0.0.1 is 127.0.0.1\n"));
    EXPECT_THAT(outcome.output, HasSubstr("TLS: none"));
    EXPECT_THAT(outcome.output, HasSubstr("status: 200, taken\nbody: {\"ok\":1}\n"));
    EXPECT_FALSE(outcome.Says("secret"));
    ASSERT_EQ(collector.RequestCount(), 1U);
    EXPECT_THAT(collector.Requests()[0].body, HasSubstr("reportctl.test"));
    EXPECT_EQ(collector.Requests()[0].headers.at("key"), "secret");
    EXPECT_EQ(Status(), "3 1 100 2 2 200") << "it does not go through the outbox";
}

TEST_F(OutboxCommand, JudgesTheAnswerAsTheUploaderDoes) {
    const auto said = [&](int status, const std::string& body = {}, const std::string& headers = {}) {
        const LoopbackServer collector(
            [&](const Request&) { return Reply{.status = status, .body = body, .headers = headers}; });
        const auto outcome = Reportctl(
            "outbox test",
            "OTEL_EXPORTER_OTLP_LOGS_HEADERS=key=secret OTEL_EXPORTER_OTLP_ENDPOINT=" + collector.Url());
        const auto begin = outcome.output.find("status: ");
        return std::to_string(outcome.exitCode) + " " +
               outcome.output.substr(begin, outcome.output.find('\n', begin) - begin);
    };
    const std::string waits = ", not taken: events would wait in the outbox";
    const std::string page =
        "; this is a page: the network may want a log-in, or the address be no collector's";
    const std::string address = "; look at the address: OTEL_EXPORTER_OTLP_ENDPOINT";
    EXPECT_EQ(said(200, "<p>", "Content-Type: TEXT/HTML\r\n"), "1 status: 200" + waits + page);
    EXPECT_EQ(said(405), "1 status: 405" + waits + address);
    EXPECT_EQ(said(302), "1 status: 302" + waits + address);
    EXPECT_EQ(said(415), "1 status: 415" + waits +
                             "; look at OTEL_EXPORTER_OTLP_COMPRESSION: the collector "
                             "may not unpack, or take no JSON");
    EXPECT_EQ(said(403), "1 status: 403" + waits +
                             "; look at the credentials: OTEL_EXPORTER_OTLP_LOGS_HEADERS sets key");
    EXPECT_EQ(said(503), "1 status: 503" + waits);
    EXPECT_EQ(said(400), "1 status: 400, refused: events would become dead letters");
    EXPECT_EQ(said(413), "1 status: 413, refused: events would become dead letters");
}

TEST_F(OutboxCommand, TellsWhatAnAnswerOfPartialSuccessMeans) {
    const auto said = [&](const std::string& members) {
        const LoopbackServer collector([&](const Request&) {
            return Reply{.status = 200, .body = R"({"partialSuccess":{)" + members + "}}", .headers = {}};
        });
        const auto outcome = Reportctl("outbox test", "OTEL_EXPORTER_OTLP_ENDPOINT=" + collector.Url());
        const auto begin = outcome.output.find("status: 200, ") + 13;
        return std::to_string(outcome.exitCode) + " " +
               outcome.output.substr(begin, outcome.output.find("\nbody: ") - begin);
    };
    EXPECT_EQ(said(R"("rejectedLogRecords":"1","errorMessage":"too\u001bodd")"),
              "1 refused for good, though the request was taken: events would be lost: too odd");
    EXPECT_EQ(said(R"("rejectedLogRecords":3)"),
              "1 refused for good, though the request was taken: events would be lost");
    EXPECT_EQ(said(R"("errorMessage":"old names")"), "0 taken, with a warning: old names");
    EXPECT_EQ(said(R"("rejectedLogRecords":"0")"), "0 taken");
}

TEST_F(OutboxCommand, TellsWhyTheTestEventWasNotTaken) {
    LoopbackServer collector(
        [](const Request&) { return Reply{.status = 401, .body = "who are you?", .headers = {}}; });
    const auto refused = Reportctl("outbox test", "OTEL_EXPORTER_OTLP_ENDPOINT=" + collector.Url());
    EXPECT_EQ(refused.exitCode, 1);
    EXPECT_TRUE(
        refused.Says("status: 401, not taken: events would wait in the outbox; look at the credentials: "
                     "OTEL_EXPORTER_OTLP_HEADERS names no header"))
        << refused.output;
    EXPECT_TRUE(refused.Says("body: who are you?")) << refused.output;

    const auto unnamed =
        Reportctl("outbox test", "OTEL_EXPORTER_OTLP_ENDPOINT=http://no-such-host.invalid:1");
    EXPECT_EQ(unnamed.exitCode, 1);
    EXPECT_TRUE(unnamed.Says("name resolution: failed: no-such-host.invalid: ")) << unnamed.output;

    const auto away = Reportctl("outbox test", "OTEL_EXPORTER_OTLP_ENDPOINT=http://127.0.0.1:1");
    EXPECT_TRUE(away.Says("no answer: ")) << away.output;

    const auto none = Reportctl("outbox test", "env -u OTEL_EXPORTER_OTLP_ENDPOINT");
    EXPECT_EQ(none.exitCode, 1);
    EXPECT_TRUE(none.Says("No collector is configured")) << none.output;
}

} // namespace
