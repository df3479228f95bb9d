#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/support/CaughtExceptions.h"
#include "tests/support/ScriptedJson.h"

using namespace SyncServiceReport;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

// ReportServer::JsonToStruct: from a report's text to its record.

namespace {

LogRecord ParseError(const std::string& message) {
    return {4, "App/ReportServer", "JsonToStruct", 123, message};
}

/// Tests run on a server that was never started.
class TheJsonToStruct : public ::testing::Test {
protected:
    ST_OptLog Converted(const std::string& json) {
        ST_OptLog log;
        EXPECT_TRUE(m_server.JsonToStruct(json, log)) << json;
        return log;
    }
    std::string CreateTimeOf(const std::string& json) {
        return Converted(R"({"createTime":)" + json + "}").createTime;
    }
    std::string ValueOf(const std::string& json) { return Converted(R"({"value":)" + json + "}").value; }
    int TypeOf(const std::string& eventID) { return Converted(R"({"eventID":")" + eventID + "\"}").pType; }
    bool IsDayReport(const std::string& json) {
        return Converted(R"({"isDayReport":)" + json + "}").isDayReport;
    }

    ReportServer m_server;
};

} // namespace

TEST_F(TheJsonToStruct, ConvertsAReport) {
    const ST_OptLog log = Converted(R"({"eventID":"A100|10001","value":{"k": "v"},"createTime":1700000000,)"
                                    R"("isDayReport":0,"other":"ignored"})");
    EXPECT_EQ(log.nReserved, 0);
    EXPECT_EQ(log.eventID, "A100|10001");
    EXPECT_EQ(log.value, R"({"k":"v"})");
    EXPECT_EQ(log.createTime, "1700000000000");
    EXPECT_EQ(log.pType, 0);
    EXPECT_FALSE(log.isDayReport);
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(TheJsonToStruct, WhatIsNoJsonLeavesTheDefaults) {
    ST_OptLog log;
    log.nReserved = 5;
    log.eventID = log.value = log.createTime = "left over";
    log.pType = 0;
    log.isDayReport = true;
    EXPECT_FALSE(m_server.JsonToStruct("eventID", log));
    EXPECT_EQ(log.nReserved, 0);
    EXPECT_EQ(log.eventID + log.value + log.createTime, "");
    EXPECT_EQ(log.pType, 1);
    EXPECT_FALSE(log.isDayReport);
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(ParseError("Invalid value. At byte 0.")));
}

TEST_F(TheJsonToStruct, AParsersTextIsAFormat) {
    g_scriptedJson.error = "near %d";
    ST_OptLog log;
    EXPECT_FALSE(m_server.JsonToStruct("{}", log));
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(ParseError(
                    "[BoostLogError]boost::too_few_args: format-string referred to more arguments than "
                    "were passed")));
}

TEST_F(TheJsonToStruct, LogsEachKindOfExceptionAndLeavesTheDefaults) {
    ST_OptLog log;
    log.eventID = "left over";
    ExpectEachKindOfExceptionToBeLogged(g_scriptedJson.throws, "App/ReportServer", "JsonToStruct", 164,
                                        [&] { return m_server.JsonToStruct("{}", log); });
    EXPECT_EQ(log.eventID, "");
}

TEST_F(TheJsonToStruct, TenCharactersOfTimeAreSeconds) {
    EXPECT_EQ(CreateTimeOf("1700000000"), "1700000000000");
    EXPECT_EQ(CreateTimeOf(R"("1700000000")"), "1700000000000");
    EXPECT_EQ(CreateTimeOf(R"("abcdefghij")"), "abcdefghij000");
    EXPECT_EQ(CreateTimeOf("-170000000"), "-170000000000") << "a minus sign counts";
    EXPECT_EQ(CreateTimeOf(R"("\u00e9\u00e9\u00e9\u00e9\u00e9")"), "\u00e9\u00e9\u00e9\u00e9\u00e9"
                                                                   "000")
        << "bytes are counted";
    EXPECT_EQ(CreateTimeOf("12345678.5"), "12345678.5000") << "no integer: its text";
}

TEST_F(TheJsonToStruct, OtherLengthsOfTimeStay) {
    for (const std::string json : {"1700000000123", "170000000", "17000000000", "0", "-1700000000", "1.5"})
        EXPECT_EQ(CreateTimeOf(json), json);
    EXPECT_EQ(CreateTimeOf(R"("abc")"), "abc");
    EXPECT_EQ(CreateTimeOf(R"("")"), "");
    EXPECT_EQ(CreateTimeOf("null"), "");
    EXPECT_EQ(CreateTimeOf("true"), "true");
    EXPECT_EQ(Converted("{}").createTime, "");
}

TEST_F(TheJsonToStruct, ExactlyOneBarIsTypeZero) {
    EXPECT_EQ(TypeOf("A100|10001"), 0);
    EXPECT_EQ(TypeOf("|"), 0);
    EXPECT_EQ(TypeOf("A100|"), 0);
    EXPECT_EQ(TypeOf("A100"), 1);
    EXPECT_EQ(TypeOf(""), 1);
    EXPECT_EQ(TypeOf("A100|1|2"), 1);
    EXPECT_EQ(TypeOf("||"), 1);
    EXPECT_EQ(TypeOf(R"(A\u007c1)"), 0) << "bars are counted in the decoded id";
    EXPECT_EQ(Converted("{}").pType, 1);
}

TEST_F(TheJsonToStruct, AnObjectsValueIsItsCompactJsonAndAnyOthersItsText) {
    EXPECT_EQ(ValueOf(R"({ "a" : [ 1 , 2.5 ] , "b" : { } })"), R"({"a":[1,2.5],"b":{}})");
    EXPECT_EQ(ValueOf(R"("it's \"text\"")"), R"(it's "text")");
    EXPECT_EQ(ValueOf("1.5"), "1.5");
    EXPECT_EQ(ValueOf("9007199254740993"), "9007199254740993");
    EXPECT_EQ(ValueOf("true"), "true");
    EXPECT_EQ(ValueOf("null"), "");
    EXPECT_EQ(ValueOf("[1, 2]"), "[1,2]");
    EXPECT_EQ(Converted("{}").value, "");
}

TEST_F(TheJsonToStruct, OnlyTheIntegerOneIsADayReport) {
    EXPECT_TRUE(IsDayReport("1"));
    for (const std::string json : {"0", "2", "-1", "1.0", R"("1")", "true", "null", "4294967297"})
        EXPECT_FALSE(IsDayReport(json)) << json;
    EXPECT_FALSE(Converted("{}").isDayReport);
}

TEST_F(TheJsonToStruct, ARootThatIsNoObjectGivesAnEmptyRecord) {
    for (const std::string json : {"[]", "5", R"("eventID")", "null"})
        EXPECT_EQ(Converted(json).eventID, "") << json;
}

TEST_F(TheJsonToStruct, AnIdIsTextWhateverItsType) {
    EXPECT_EQ(Converted(R"({"eventID":100})").eventID, "100");
    EXPECT_EQ(Converted(R"({"eventID":["A|"]})").eventID, R"(["A|"])");
    EXPECT_EQ(Converted(R"({"eventID":["A|"]})").pType, 0);
}
