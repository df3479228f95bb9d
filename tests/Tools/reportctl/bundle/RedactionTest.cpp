#include "Tools/reportctl/bundle/Redaction.h"

#include <gtest/gtest.h>

namespace {

using reportctl::bundle::RedactedDatagram;
using reportctl::bundle::Redaction;

const Redaction REDACTION(false, "/home/anna");

std::string Redacted(const std::string& siteAndMessage) {
    const std::string head = "2026-11-20 10:15:30.123 INFO  [1:2] ";
    const auto line = REDACTION.OfLogLine(head + siteAndMessage);
    EXPECT_EQ(line.substr(0, head.size()), head);
    return line.substr(head.size());
}

TEST(BundleRedaction, LeavesOfAReportWhatTellsNothingOfAPerson) {
    EXPECT_EQ(Redacted(R"([App/ReportServer:42 Recv] {"eventID":"B1|1","value":"secret",)"
                       R"("createTime":1700000000,"x":"secret"})"),
              R"([App/ReportServer:42 Recv] {"eventID":"B1|1","value":"[value, 6 bytes]",)"
              R"("createTime":"1700000000000"})");
}

TEST(BundleRedaction, LeavesATimeThatIsANumberAlone) {
    EXPECT_EQ(RedactedDatagram(R"({"eventID":"B1|1","value":"","createTime":"born in May"})"),
              R"({"eventID":"B1|1","value":"[value, 0 bytes]","createTime":"[createTime, 11 bytes]"})");
    EXPECT_EQ(RedactedDatagram(R"({"eventID":"B1|1","value":""})"),
              R"({"eventID":"B1|1","value":"[value, 0 bytes]","createTime":""})");
}

TEST(BundleRedaction, LeavesOfAControlMessageTheModule) {
    EXPECT_EQ(
        RedactedDatagram(
            R"({"msgType":"init","exdata":{"moduleID":"A1","openID":"secret","dbPath":"/x","y":"secret"}})"),
        R"({"msgType":"init","exdata":{"moduleID":"A1","dbPath":"/x","openID":"[open id, 6 bytes]"}})");
}

TEST(BundleRedaction, LeavesNothingOfATextThatIsNoJson) {
    EXPECT_EQ(RedactedDatagram(R"({"eventID":"B1","value":"secret)"), "[a text that is no JSON, 31 bytes]");
}

TEST(BundleRedaction, TakesTheStatementOutOfAnError) {
    EXPECT_EQ(
        Redacted("[Frame/DBHelper:38 ExecSql] near \"secret\": syntax error-insert into OperLog (eventID) "
                 "values('B1', 'secret')"),
        "[Frame/DBHelper:38 ExecSql] near \"...\": syntax error-[statement]");
}

TEST(BundleRedaction, TakesTheUserOut) {
    EXPECT_EQ(Redacted("[App/ReportServer:111 SetBaseInfo] SetBaseInfo secret-5.1"),
              "[App/ReportServer:111 SetBaseInfo] SetBaseInfo [open id and version]");
}

TEST(BundleRedaction, ShortensTheHomeDirectory) {
    EXPECT_EQ(Redacted("[A/B:1 f] /home/anna/x and /home/anna"), "[A/B:1 f] ~/x and ~");
    EXPECT_EQ(Redaction(true, "/home/anna").OfText("/home/anna"), "/home/anna");
}

TEST(BundleRedaction, TakesTheStatementOutOfAnyTextThatQuotesTheLog) {
    EXPECT_EQ(REDACTION.OfText(
                  "one\nlast error: near \"secret\": syntax error-insert into OperLog values('secret')\n"
                  "two"),
              "one\nlast error: near \"...\": syntax error-[statement]\ntwo");
}

TEST(BundleRedaction, LeavesNothingOfHalfALine) {
    EXPECT_EQ(REDACTION.OfLogLine("alue\":\"secret\"}"), "[half a line, 15 bytes]");
}

} // namespace
