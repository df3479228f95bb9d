#include <chrono>

#include "App/ReportServer.h"
#include "SystemTool/IO/JsonDocument.h"
#include "tests/Tools/reportctl/support/SendFixture.h"

namespace {

class Send : public SendFixture {
protected:
    /// Sends with these arguments, expects `told` as the output, and returns the text that arrives.
    std::string Arrival(const std::string& arguments, const std::string& told) const {
        Listener listener;
        const auto outcome = SendFixture::Send(arguments);
        EXPECT_EQ(outcome.exitCode, 0);
        auto text = listener.Receive();
        EXPECT_EQ(outcome.output, told + " (" + std::to_string(text.size()) + " bytes)\n");
        EXPECT_TRUE(listener.IsEmpty());
        return text;
    }

    /// The text that would be sent.
    std::string Text(const std::string& arguments) const {
        const auto output = SendFixture::Send("--dry-run " + arguments).output;
        return output.substr(0, output.find('\n'));
    }
};

TEST_F(Send, SendsAReportFromItsFlags) {
    EXPECT_EQ(
        Arrival("--event 'B100|10001' --value 'opened the door' --time 1700000000123",
                "sent event \"B100|10001\", for the store"),
        R"({"eventID":"B100|10001","value":"opened the door","createTime":1700000000123,"isDayReport":0})");
}

TEST_F(Send, SendsAValueThatIsAnObjectAsAnObject) {
    EXPECT_EQ(Arrival("--event 'A759|1' --value '{\"n\": 1.5}' --time 1700000000 --day-report",
                      "sent event \"A759|1\", for analytics"),
              R"({"eventID":"A759|1","value":{"n":1.5},"createTime":1700000000,"isDayReport":1})");
}

TEST_F(Send, SendsOtherJsonAsAString) {
    for (const std::string value : {"[1,2]", "5", "null", "-5", "{}}", "x\"y"}) {
        SystemTool::IO::JsonDocument report;
        std::string error;
        report.FromJson(Text("--event B --value '" + value + "'"), error);
        EXPECT_EQ(error, "");
        EXPECT_EQ(report.GetKeyValue("value").ToString(), value);
    }
}

TEST_F(Send, TakesTheTimeOfNowInMilliseconds) {
    const auto nowMs = [] {
        return std::chrono::duration_cast<std::chrono::milliseconds>(
                   std::chrono::system_clock::now().time_since_epoch())
            .count();
    };
    const auto before = nowMs();
    SystemTool::IO::JsonDocument report;
    std::string error;
    report.FromJson(Text("--event B"), error);
    EXPECT_GE(report.GetKeyValue("createTime").ToLongLong(), before) << error;
    EXPECT_LE(report.GetKeyValue("createTime").ToLongLong(), nowMs());
}

TEST_F(Send, BuildsWhatTheServiceReadsBack) {
    const auto text = Text("--event 'B1|2' --value '{\"a\":\"ü\"}' --time 1700000000 --day-report");
    SyncServiceReport::ReportServer service;
    SyncServiceReport::ST_OptLog report;
    ASSERT_TRUE(service.JsonToStruct(text, report)) << text;
    EXPECT_EQ(report.eventID, "B1|2");
    EXPECT_EQ(report.value, R"({"a":"ü"})");
    EXPECT_EQ(report.createTime, "1700000000000");
    EXPECT_EQ(report.pType, 0);
    EXPECT_TRUE(report.isDayReport);
}

TEST_F(Send, AnnouncesAModule) {
    EXPECT_EQ(
        Arrival("init --module A100 --version 1.2 --name editor --log-path /l --db-path /d --open-id u1 "
                "--suite-version 5.1.0.2",
                "sent init of module \"A100\""),
        R"({"msgType":"init","exdata":{"moduleID":"A100","moduleVersion":"1.2","moduleName":"editor",)"
        R"("logPath":"/l","dbPath":"/d","openID":"u1","hublinkVersion":"5.1.0.2"}})");
}

TEST_F(Send, EscapesWhatWouldMakeAControlMessageAReport) {
    EXPECT_EQ(Arrival("init --module A100 --version 'eventIDeventID' --name eventID",
                      "sent init of module \"A100\""),
              R"({"msgType":"init","exdata":{"moduleID":"A100","moduleVersion":"event\u0049Devent\u0049D",)"
              R"("moduleName":"event\u0049D","logPath":"","dbPath":"","openID":"","hublinkVersion":""}})");
}

TEST_F(Send, TellsWhoIsSignedIn) {
    EXPECT_EQ(Arrival("open-id u1 --suite-version 5.1.0.2", "sent updateOpenID to \"u1\""),
              R"({"msgType":"updateOpenID","exdata":{"openID":"u1","hublinkVersion":"5.1.0.2"}})");
    EXPECT_EQ(Arrival("open-id u1", "sent updateOpenID to \"u1\""),
              R"({"msgType":"updateOpenID","exdata":{"openID":"u1","hublinkVersion":""}})");
}

TEST_F(Send, PrintsTheTextAndSendsNothingInADryRun) {
    Listener listener;
    for (const auto* order : {"--dry-run open-id u1", "open-id u1 --dry-run"}) {
        const auto outcome = SendFixture::Send(order);
        EXPECT_EQ(outcome.exitCode, 0);
        EXPECT_EQ(outcome.output, "{\"msgType\":\"updateOpenID\",\"exdata\":{\"openID\":\"u1\","
                                  "\"hublinkVersion\":\"\"}}\n"
                                  "dry run: would send updateOpenID to \"u1\" (71 bytes)\n");
    }
    EXPECT_TRUE(listener.IsEmpty());
}

TEST_F(Send, SendsNothingThatTheServiceWouldNotUse) {
    Listener listener;
    const auto outcome = SendFixture::Send("open-id \"it's me\"");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_EQ(outcome.output,
              "error: its openID holds a single quote. The service puts the text into its SQL as it is, and "
              "the database would reject every report while it is set. Written twice it is stored as one "
              "quote, and goes to analytics as two\n"
              "error: nothing was sent. With --anyway it is sent as it is\n");
    EXPECT_TRUE(listener.IsEmpty());
}

TEST_F(Send, SendsItAnywayWhenAskedTo) {
    Listener listener;
    const auto outcome = SendFixture::Send("open-id '' --anyway");
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_EQ(outcome.output, "warning: it has no openID in its exdata: the service would do nothing\n"
                              "sent updateOpenID to \"\" (69 bytes)\n");
    EXPECT_EQ(listener.Receive(), R"({"msgType":"updateOpenID","exdata":{"openID":"","hublinkVersion":""}})");
}

TEST_F(Send, SaysWhenNobodyListens) {
    const auto outcome = SendFixture::Send("open-id u1");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_EQ(outcome.output, std::string("error: ") + NO_LISTENER);
}

TEST_F(Send, DoesNothingForACommandLineThatItDoesNotUnderstand) {
    Listener listener;
    for (const auto* arguments :
         {"", "nonsense", "init", "open-id", "open-id u1 --event B", "--event B -", "--event B --file x",
          "- --file x", "init --module A1 open-id u1", "--value x", "--event B --time soon", "- --rate 0"}) {
        const auto outcome = SendFixture::Send(arguments, "echo '{\"eventID\":\"B\"}' |");
        EXPECT_GE(outcome.exitCode, 100) << arguments << "\n" << outcome.output;
    }
    EXPECT_TRUE(listener.IsEmpty());
}

TEST_F(Send, ShowsExamplesThatWork) {
    const auto help = SendFixture::Send("--help").output;
    EXPECT_NE(help.find("Exit codes: 0 done"), std::string::npos) << help;
    for (const std::string example :
         {"send --event 'B100|10001' --value 'opened the door'",
          "send --event 'A759|10001' --value '{\"clicks\":3}' --time 1700000000",
          "send init --module A100 --version 1.2 --name editor --log-path /tmp/log --db-path /tmp/db",
          "send open-id u4711 --suite-version 5.1.0.2"}) {
        EXPECT_NE(help.find("  reportctl " + example + "\n"), std::string::npos) << example;
        const auto outcome = Reportctl(example + " --dry-run");
        EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
        EXPECT_FALSE(outcome.Says("warning")) << outcome.output;
    }
}

} // namespace
