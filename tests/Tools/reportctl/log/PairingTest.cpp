#include "Tools/reportctl/log/Pairing.h"

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using reportctl::log::Line;
using reportctl::log::Outcome;
using ::testing::ElementsAre;

/// Gives the lines of a service's log to the class, one by one.
class LogPairing : public ::testing::Test {
protected:
    void Take(const std::string& site, const std::string& function, int level, const std::string& message,
              const std::string& process = "1") {
        m_pairing.Take({.time = {},
                        .stamp = {},
                        .level = level,
                        .process = process,
                        .site = site,
                        .number = {},
                        .function = function,
                        .message = message});
    }

    void Arrive(const std::string& text, const std::string& process = "1") {
        Take("App/ReportServer", "Recv", 2, text, process);
    }

    void ArriveReport(const std::string& eventID, const std::string& value) {
        Arrive(fmt::format(R"({{"eventID":"{}","value":"{}","createTime":1700000000}})", eventID, value));
    }

    /// How the report of each line ended, with the reason.
    std::vector<std::string> Ends() {
        std::vector<std::string> ends;
        for (const auto& entry : m_pairing.Entries())
            ends.push_back(entry.isDatagram
                               ? WordFor(entry.outcome) + (entry.reason.empty() ? "" : ": " + entry.reason)
                               : entry.line.message);
        return ends;
    }

    static std::string Refusal(const std::string& reason, const std::string& eventID,
                               const std::string& value) {
        return fmt::format("{}-insert into OperLog (eventID,value,createTime,pType,extData3,extData4) "
                           "values('{}', '{}','1700000000000',1,'','u')",
                           reason, eventID, value);
    }

    reportctl::log::Pairing m_pairing;
};

TEST_F(LogPairing, TellsTheReasonOfTheReportThatTheDatabaseRefused) {
    ArriveReport("B1", "one");
    ArriveReport("B1", "it's");
    ArriveReport("B1", "three");
    Take("Frame/DBHelper", "ExecSql", 4, Refusal("near \"s\": syntax error", "B1", "it's"));
    EXPECT_THAT(Ends(), ElementsAre("unknown", "refused: near \"s\": syntax error", "unknown"));
}

TEST_F(LogPairing, GivesEachOfTwoEqualReportsALineOfItsOwn) {
    ArriveReport("B1", "it's");
    ArriveReport("B1", "it's");
    Take("Frame/DBHelper", "ExecSql", 4, Refusal("a", "B1", "it's"));
    Take("Frame/DBHelper", "ExecSql", 4, Refusal("b", "B1", "it's"));
    EXPECT_THAT(Ends(), ElementsAre("refused: a", "refused: b"));
}

TEST_F(LogPairing, TellsWhatAnalyticsDoesNotTake) {
    ArriveReport("A200|1", "");
    ArriveReport("Anobar", "");
    ArriveReport("A759|1", "no JSON");
    ArriveReport("A759|1", "");
    Take("Metrik/MetrikMgr", "Send", 3, "module not init :A200");
    Take("Metrik/MetrikMgr", "Send", 3, "eventID error :Anobar");
    Take("Metrik/MetrikWorker", "Send", 4, "Invalid value. At byte 0.");
    EXPECT_THAT(Ends(), ElementsAre("refused: module not init :A200", "refused: eventID error :Anobar",
                                    "refused: Invalid value. At byte 0.", "unknown"));
}

TEST_F(LogPairing, TellsWhatIsNoJson) {
    Arrive(R"({"eventID":)");
    Arrive("no JSON");
    Arrive(R"({"msgType":"init","exdata":{"moduleID":"A1"}})");
    Arrive(R"({"msgType":"other"})");
    Take("App/ReportServer", "JsonToStruct", 4, "Invalid value. At byte 11.");
    Take("Metrik/MetrikMgr", "Update", 4, "json formate error :Invalid value. At byte 0.");
    EXPECT_THAT(
        Ends(),
        ElementsAre("refused: Invalid value. At byte 11.",
                    "refused: json formate error :Invalid value. At byte 0.", "control",
                    "control: no report, and no control message that the service knows: it does nothing"));
}

TEST_F(LogPairing, TellsARefusalThatNamesNothingOnlyWhereOneDatagramCanBeMeant) {
    ArriveReport("A759|1", "");
    Take("Metrik/MetrikWorker", "FailCallBackFun", 4, "outbox file-Cannot store an event: disk is full");
    ArriveReport("A759|2", "");
    ArriveReport("A759|3", "");
    Take("Metrik/MetrikWorker", "FailCallBackFun", 4,
         "outbox file-Cannot store an event: database is locked");
    EXPECT_THAT(Ends(), ElementsAre("refused: outbox file-Cannot store an event: disk is full", "unknown",
                                    "unknown", "outbox file-Cannot store an event: database is locked"));
    EXPECT_EQ(m_pairing.AnalyticsFailures(), 2);
}

TEST_F(LogPairing, DoesNotTakeTheUploadersTroubleForARefusal) {
    ArriveReport("A759|1", "");
    Take("Metrik/MetrikWorker", "FailCallBackFun", 4,
         "upload-http://c: HTTP status 503; the events stay in the outbox");
    Take("Metrik/MetrikWorker", "FailCallBackFun", 4, "outbox file-Cannot read the outbox: disk I/O error");
    EXPECT_EQ(Ends()[0], "unknown");
}

TEST_F(LogPairing, SaysUnknownOfADatagramThatTheLogCouldNotWrite) {
    Arrive("[BoostLogError]boost::too_few_args: format-string referred to more arguments than were passed");
    EXPECT_THAT(Ends(), ElementsAre("unknown: the log could not write its text"));
}

TEST_F(LogPairing, DoesNotGiveARefusalToTheServiceBefore) {
    ArriveReport("A200|1", "before the crash");
    Arrive(R"({"eventID":"A200|2"})", "2");
    Take("Metrik/MetrikMgr", "Send", 3, "module not init :A200", "2");
    EXPECT_THAT(Ends(), ElementsAre("unknown", "refused: module not init :A200"));
}

TEST_F(LogPairing, CannotBeForgedByADatagram) {
    ArriveReport("B1", "x");
    Arrive("2026-11-20 10:15:30.123 ERROR [1:1] [Frame/DBHelper:1 ExecSql] " + Refusal("forged", "B1", "x"));
    EXPECT_EQ(Ends()[0], "unknown");
}

} // namespace
