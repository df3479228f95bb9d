#include <algorithm>
#include <atomic>

#include <Poco/Net/ServerSocket.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/Modules/MetrikSdk/support/LoopbackServer.h"
#include "tests/e2e/support/Service.h"
#include "tests/support/WaitUntil.h"

using ::testing::ContainsRegex;
using ::testing::HasSubstr;
using ::testing::Not;

// What reportctl shows of a running service.

namespace {

using namespace std::chrono_literals;

class Look : public ::testing::Test {
protected:
    void InstallAndStart() {
        m_service.Install();
        m_service.Start();
    }

    /// Runs reportctl, and returns what it printed.
    std::string Reportctl(const std::vector<std::string>& arguments, int exitCode = 0) const {
        const auto before = m_service.Output().size();
        EXPECT_EQ(m_service.Reportctl(arguments), exitCode);
        return m_service.Output().substr(before);
    }

    std::int64_t InOutbox(const std::string& what) const {
        return m_service.Count(m_service.OutboxFile(), "select " + what);
    }

    Service m_service;
};

} // namespace

TEST_F(Look, TailTellsWhereEachReportEnded) {
    InstallAndStart();
    Service::Send(R"({"eventID":"B1|1","value":"it''s kept","createTime":1700000000})");
    Service::Send(R"({"eventID":"B1|2","value":"it's lost","createTime":1700000000})");
    Service::Send(R"({"eventID":"A759|1","value":{"a":1},"createTime":1700000000})");
    Service::Send(R"({"eventID":"A200|1","value":{"a":1},"createTime":1700000000})");
    Service::Send(R"({"msgType":"updateOpenID","exdata":{"openID":"u1"}})");
    Service::Send("{\"eventID\":\"B1|3\",\"value\":\"\\u001b[31m\xe2\x80\xae\"}");
    m_service.AwaitQuiet();

    const auto text = Reportctl({"tail", "--no-follow", "--since", "1h"});
    EXPECT_THAT(text, HasSubstr("  report   B1|1           it''s kept  -> stored\n"));
    EXPECT_THAT(text,
                HasSubstr("  report   B1|2           it's lost  -> refused: near \"s\": syntax error\n"));
    EXPECT_THAT(text, HasSubstr("  event    A759|1         {\"a\":1}  -> toAnalytics\n"));
    EXPECT_THAT(text, HasSubstr("  event    A200|1         {\"a\":1}  -> refused: module not init :A200\n"));
    EXPECT_THAT(text, HasSubstr("  control  updateOpenID  -> control\n"));
    EXPECT_THAT(text, HasSubstr("\\x1b[31m\\xe2\\x80\\xae  -> stored\n"));
    EXPECT_THAT(text, Not(HasSubstr("\x1b")));

    const auto refused =
        Reportctl({"tail", "--no-follow", "--since", "1h", "--refused", "--event", "B1", "--json"});
    EXPECT_THAT(refused, HasSubstr(R"("kind":"report","eventID":"B1|2","outcome":"refused",)"
                                   R"("reason":"near \"s\": syntax error","text":"{\"eventID\":\"B1|2\",)"));
    EXPECT_EQ(std::count(refused.begin(), refused.end(), '\n'), 1);
}

TEST_F(Look, FindTellsOfEveryPlace) {
    InstallAndStart();
    Service::Send(R"({"eventID":"B1|1","value":"needle in the store","createTime":1700000000})");
    Service::Send(R"({"eventID":"A759|1","value":{"a":"needle for analytics"},"createTime":1700000000})");
    m_service.AwaitQuiet();
    const auto text = Reportctl({"find", "needle"});
    EXPECT_THAT(text, HasSubstr("needle in the store  -> stored\n"));
    EXPECT_THAT(text, HasSubstr("  -> toAnalytics\n"));
    EXPECT_THAT(text, ContainsRegex("Store .since 2023-11-1[45] ..:13:20.000.: 1 found\n"));
    EXPECT_THAT(text, HasSubstr("Outbox: 1 found\n"));
    Service::Send(R"({"eventID":"B1|2","value":{"a" : "needle"},"createTime":1700000000})");
    Service::Send(R"({"eventID":"A759|2","value":{"a" : "it''s \/ needle"},"createTime":1700000000})");
    m_service.AwaitQuiet();
    EXPECT_THAT(Reportctl({"find", R"({"a" : "needle"})"}), ContainsRegex("Store .*: 1 found\n  row 2 "));
    EXPECT_THAT(Reportctl({"find", R"(it''s \/ needle)"}), HasSubstr("Outbox: 1 found\n"));
    EXPECT_THAT(Reportctl({"find", "haystack"}, 1), HasSubstr("Outbox: 0 found\n"));
}

TEST_F(Look, ARetriedDeadLetterIsDeliveredByTheServiceThatRuns) {
    constexpr auto COLLECTOR = "127.0.0.1:4318";
    std::atomic<int> status = 400;
    const LoopbackServer collector(
        [&](const Request&) { return Reply{.status = status, .body = "{}", .headers = {}}; },
        Poco::Net::ServerSocket(Poco::Net::SocketAddress(COLLECTOR)));
    m_service.SetEnvironment(std::string("OTEL_EXPORTER_OTLP_ENDPOINT=http://") + COLLECTOR);
    InstallAndStart();
    Service::Send(R"({"eventID":"A759|1","value":{"a":1}})");
    ASSERT_TRUE(WaitUntil([&] { return InOutbox("dead_letters from outbox_status") == 1; }, 30s));
    status = 200;
    EXPECT_THAT(Reportctl({"outbox", "test"}), HasSubstr("of the running service, process "));
    EXPECT_THAT(Reportctl({"outbox", "retry", "--all"}), HasSubstr("1 put back\n"));
    // Otherwise the uploader looks only after half a minute.
    Service::Send(R"({"eventID":"A759|2","value":{"a":1}})");
    EXPECT_TRUE(WaitUntil([&] { return InOutbox("delivered from outbox_status") == 2; }, 60s));
    EXPECT_EQ(InOutbox("stored from outbox_status"), 3);
    EXPECT_EQ(InOutbox("waiting from outbox_status"), 0);
    EXPECT_EQ(InOutbox("last_sequence from module where module_id = 'A759'"), 3);
}

TEST_F(Look, SendTellsOfAModuleThatTheServiceDoesNotKnow) {
    InstallAndStart();
    const std::string warning =
        "warning: the module \"A200\" has not announced itself to the running service";
    EXPECT_THAT(Reportctl({"send", "--event", "A200|1"}), HasSubstr(warning));
    Reportctl({"send", "init", "--module", "A200"});
    m_service.AwaitQuiet();
    EXPECT_THAT(Reportctl({"send", "--event", "A200|1"}), Not(HasSubstr("warning")));
}
