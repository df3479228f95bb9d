#include <chrono>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <hublink/report.hpp>

#include "tests/Client/ServicePort.h"

using hublink::Json;
using hublink::Result;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

namespace {

constexpr auto INIT =
    R"({"msgType":"init","exdata":{"moduleID":"A100","moduleVersion":"2.1","moduleName":"Painter",)"
    R"("logPath":"","dbPath":"","openID":"","hublinkVersion":""}})";

/// The datagram that the library makes of an event.
class ClientEvent : public ::testing::Test {
protected:
    const hublink::Reporter::Time m_time{std::chrono::milliseconds(1700000000123)};
    ServicePort m_port;
    hublink::Reporter m_reporter{hublink::Module{"A100", "2.1", "Painter"}};

    /// Sends an event at m_time, and returns its datagram.
    std::string ValueOnTheWire(const std::string& id, hublink::Value value) {
        EXPECT_EQ(m_reporter.Event(id, value, m_time), Result::Sent) << id << " " << value.Text();
        return m_port.TakeOne();
    }

    static std::string Report(const std::string& idAndValue) {
        return R"({"eventID":)" + idAndValue + R"(,"createTime":1700000000123,"isDayReport":0})";
    }

    Result Judged(std::string_view id, hublink::Value value = {}) {
        const Result result = m_reporter.Event(id, value);
        EXPECT_EQ(m_port.Take().empty(), result != Result::Sent);
        return result;
    }
};

} // namespace

TEST_F(ClientEvent, ATextForTheStoreHasItsQuotesDoubledAndEverythingElseEscapedAsJsonDoes) {
    EXPECT_EQ(
        ValueOnTheWire("B'1|2", "it's \"x\" \\ \n\r\t\x01 100% \u00e4 \U0001F600"),
        Report("\"B''1|2\",\"value\":\"it''s \\\"x\\\" \\\\ \\n\\r\\t\\u0001 100% \u00e4 \U0001F600\""));
}

TEST_F(ClientEvent, NothingHasNoValue) {
    EXPECT_EQ(ValueOnTheWire("B1", {}), Report(R"("B1")"));
    EXPECT_EQ(ValueOnTheWire("B1", static_cast<const char*>(nullptr)), Report(R"("B1")"));
    EXPECT_EQ(ValueOnTheWire("B1", ""), Report(R"("B1","value":"")"));
    EXPECT_EQ(ValueOnTheWire("A759|1", std::nullopt), Report(R"("A759|1")"));
}

TEST_F(ClientEvent, AnObjectForTheStoreHasTheQuotesOfItsStringsAndKeysDoubledHoweverTheyAreSpelled) {
    EXPECT_EQ(
        ValueOnTheWire("B1", Json{R"( { "it's" : [ "\u0027 \\u0027 \\' \" ' ", 1.5, -3e2 , null ] } )"}),
        Report(R"("B1","value":{"it''s":["'' \\u0027 \\'' \" '' ",1.5,-3e2,null]})"));
}

TEST_F(ClientEvent, AnObjectForAnalyticsIsSentAsItIsWithoutWhiteSpace) {
    EXPECT_EQ(ValueOnTheWire("A759|it's", Json{R"({ "it's": "\u0027\u0000 eventID" })"}),
              Report(R"("A759|it's","value":{"it's":"\u0027\u0000 eventID"})"));
}

TEST_F(ClientEvent, JsonThatTheServiceWouldPrintDifferentlyGoesToTheStoreAsAText) {
    EXPECT_EQ(ValueOnTheWire("B1", Json{R"([ 1, "it's" ])"}), Report(R"("B1","value":"[1,\"it''s\"]")"));
    EXPECT_EQ(ValueOnTheWire("B1", Json{"5"}), Report(R"("B1","value":"5")"));
    EXPECT_EQ(ValueOnTheWire("B1", Json{"null"}), Report(R"("B1","value":"null")"));
    EXPECT_EQ(ValueOnTheWire("B1", Json{R"("\u0027")"}), Report(R"("B1","value":"\"\\u0027\"")"));
    for (const std::string number : {"18446744073709551616", "-9223372036854775809", "0.1234567890123456",
                                     "1e309", "-0", "1e-301", "1.7976931348623158079e308"})
        EXPECT_EQ(ValueOnTheWire("B1", Json{"{\"n\":" + number + "}"}),
                  Report("\"B1\",\"value\":\"{\\\"n\\\":" + number + "}\""));
    for (const std::string number : {"18446744073709551615", "-9223372036854775808", "0.123456789012345",
                                     "1e300", "0", "-0.0", "0e999", "123456789012345000000000.0"})
        EXPECT_EQ(ValueOnTheWire("B1", Json{"{\"n\":" + number + "}"}),
                  Report(R"("B1","value":{"n":)" + number + "}"));
}

TEST_F(ClientEvent, TheTimeIsNowUnlessItIsGiven) {
    const auto nowMs = [] {
        return std::chrono::duration_cast<std::chrono::milliseconds>(
                   std::chrono::system_clock::now().time_since_epoch())
            .count();
    };
    const auto before = nowMs();
    ASSERT_EQ(m_reporter.Event("B1"), Result::Sent);
    const auto after = nowMs();
    const std::string text = m_port.TakeOne();
    const auto sent = std::stoll(text.substr(text.find("createTime") + 12));
    EXPECT_GE(sent, before) << text;
    EXPECT_LE(sent, after) << text;
}

TEST_F(ClientEvent, ATimeOfTenCharactersIsNotSentAsOne) {
    const auto sent = [this](std::int64_t ms) {
        EXPECT_EQ(m_reporter.Event("B1", {}, hublink::Reporter::Time(std::chrono::milliseconds(ms))),
                  Result::Sent);
        const std::string text = m_port.TakeOne();
        const auto begin = text.find("createTime") + 12;
        return text.substr(begin, text.find(",\"isDay") - begin);
    };
    EXPECT_EQ(sent(999'999'999), "999999999");
    EXPECT_EQ(sent(1'000'000'000), "\"01000000000\"");
    EXPECT_EQ(sent(9'999'999'999), "\"09999999999\"");
    EXPECT_EQ(sent(10'000'000'000), "10000000000");
    EXPECT_EQ(sent(-123'456'789), "\"-0123456789\"");
    EXPECT_EQ(sent(-1), "-1");
}

TEST_F(ClientEvent, ADayReportIsMarked) {
    ASSERT_EQ(m_reporter.Event("B1", "x", m_time, true), Result::Sent);
    EXPECT_EQ(m_port.TakeOne(), R"({"eventID":"B1","value":"x","createTime":1700000000123,"isDayReport":1})");
}

TEST_F(ClientEvent, AnIdThatTheServiceCouldNotUseIsRefused) {
    using std::string_view_literals::operator""sv;
    for (const auto id : {""sv, "\xff"sv, "B\0"sv, "B\xed\xa0\x80"sv, "B\xc0\xaf"sv, "B\xf4\x90\x80\x80"sv,
                          "B\xe2\x82"sv, "A"sv, "A759"sv, "A101|1"sv, "A1001|1"sv, "A10|1"sv})
        EXPECT_EQ(Judged(id), Result::InvalidEventId) << id;
    for (const auto id : {"A759|"sv, "A759|1|2"sv, "a"sv, "|"sv, "\u00e4"sv, "\U0010FFFF"sv})
        EXPECT_EQ(Judged(id), Result::Sent) << id;
}

TEST_F(ClientEvent, ATextWithAZeroOrWithoutUtf8IsRefused) {
    using std::string_view_literals::operator""sv;
    for (const auto text : {"a\0b"sv, "\x80"sv, "\xe0\x80\x80"sv, "\xf0\x80\x80\x80"sv, "01234567\xff"sv}) {
        EXPECT_EQ(Judged("B1", text), Result::InvalidText);
        EXPECT_EQ(Judged("B1", Json{text}), Result::InvalidText);
        EXPECT_EQ(Judged("A759|1", text), Result::InvalidText);
    }
}

TEST_F(ClientEvent, WhatIsNoJsonIsRefused) {
    for (const auto* text : {"",
                             " ",
                             "{",
                             "}",
                             "[1,]",
                             "[,1]",
                             "[1 2]",
                             "{\"a\"}",
                             "{\"a\":}",
                             "{a:1}",
                             "{\"a\":1,}",
                             "01",
                             "1.",
                             ".5",
                             "-",
                             "1e",
                             "+1",
                             "nul",
                             "nulls",
                             "\"",
                             "\"\n\"",
                             R"("\x")",
                             R"("\u12g4")",
                             R"("\ud800")",
                             R"("\ud800\u0041")",
                             R"("\udc00")",
                             "1 2",
                             "{}{}",
                             "'a'",
                             "[1}",
                             "\xef\xbb\xbf{}"})
        EXPECT_EQ(Judged("B1", Json{text}), Result::InvalidJson) << text;
}

TEST_F(ClientEvent, AnalyticsTakesNothingOrAnObjectThatTheServiceCanRead) {
    const auto nested = [](std::size_t levels) {
        std::string text;
        for (std::size_t level = 1; level < levels; ++level)
            text += "{\"a\":";
        return text + "{}" + std::string(levels - 1, '}');
    };
    for (const auto* text : {"[]", "5", "null", "\"a\"", "{\"n\":18446744073709551616}", "{\"n\":1e309}"})
        EXPECT_EQ(Judged("A759|1", Json{text}), Result::InvalidJson) << text;
    EXPECT_EQ(Judged("A759|1", Json{nested(128)}), Result::InvalidJson);
    EXPECT_EQ(Judged("A759|1", Json{nested(127)}), Result::Sent);
    EXPECT_EQ(Judged("A759|1", Json{"{\"n\":0.1234567890123456789}"}), Result::Sent) << "the nearest double";
    EXPECT_EQ(Judged("A759|1", "{}"), Result::InvalidJson) << "a text is none";
    EXPECT_EQ(Judged("A759|1", ""), Result::InvalidJson);
}

TEST_F(ClientEvent, TheLimitIsThatOfTheDatagram) {
    const std::size_t room = 10240 - Report(R"("B1","value":"")").size();
    EXPECT_EQ(Judged("B1", std::string(room, 'x')), Result::Sent);
    EXPECT_EQ(Judged("B1", std::string(room + 1, 'x')), Result::TooLong);
    EXPECT_EQ(Judged("B1", std::string(room / 2, '\'')), Result::Sent);
    EXPECT_EQ(Judged("B1", std::string(room / 2 + 1, '\'')), Result::TooLong);
    EXPECT_EQ(Judged("B1", Json{"[" + std::string(20'000, ' ') + "]"}), Result::Sent)
        << "white space is not sent";
    EXPECT_EQ(Judged("B1", Json{std::string(11'000, '[') + std::string(11'000, ']')}), Result::TooLong);
    EXPECT_EQ(Judged(std::string(11'000, 'B')), Result::TooLong);
}

TEST_F(ClientEvent, TheModuleIsAnnouncedBeforeItsFirstEventAndNoOther) {
    EXPECT_EQ(m_reporter.Event("B1", {}, m_time), Result::Sent);
    EXPECT_EQ(m_reporter.Event("A759|1", {}, m_time), Result::Sent);
    EXPECT_THAT(m_port.Take(), ElementsAre(Report(R"("B1")"), Report(R"("A759|1")")));
    EXPECT_EQ(m_reporter.Event("A100|1", {}, m_time), Result::Sent);
    EXPECT_EQ(m_reporter.Event("A100|2", {}, m_time), Result::Sent);
    EXPECT_THAT(m_port.Take(), ElementsAre(INIT, Report(R"("A100|1")"), Report(R"("A100|2")")));
}

TEST_F(ClientEvent, AControlMessageHidesTheMarkOfReports) {
    hublink::Reporter reporter(hublink::Module{"AeventID", "it's \"eventID\" \\eventID", "eventIDeventID"});
    EXPECT_EQ(reporter.Event("AeventID|1"), Result::Sent);
    EXPECT_EQ(
        m_port.Take().front(),
        R"({"msgType":"init","exdata":{"moduleID":"Aevent\u0049D",)"
        R"("moduleVersion":"it's \"event\u0049D\" \\event\u0049D","moduleName":"event\u0049Devent\u0049D",)"
        R"("logPath":"","dbPath":"","openID":"","hublinkVersion":""}})");
}

TEST_F(ClientEvent, AModuleThatCannotBeAnnouncedHasNoEvents) {
    using std::string_literals::operator""s;
    EXPECT_EQ(hublink::Reporter(hublink::Module{"A1", "\xff"}).Event("A1|1"), Result::InvalidText);
    EXPECT_EQ(hublink::Reporter(hublink::Module{"A1", "1", "a\0"s}).Event("A1|1"), Result::InvalidText);
    EXPECT_EQ(hublink::Reporter(hublink::Module{"A1", "1", std::string(11'000, 'x')}).Event("A1|1"),
              Result::TooLong);
    EXPECT_THAT(m_port.Take(), IsEmpty());
    EXPECT_EQ(hublink::Reporter(hublink::Module{"A1", "\xff"}).Event("B1"), Result::Sent);
}

TEST_F(ClientEvent, TheUserIsSentAtOnce) {
    EXPECT_EQ(m_reporter.SetUser("u\"1", "5.1 eventID"), Result::Sent);
    EXPECT_EQ(m_port.TakeOne(),
              R"({"msgType":"updateOpenID","exdata":{"openID":"u\"1","hublinkVersion":"5.1 event\u0049D"}})");
    EXPECT_EQ(m_reporter.SetUser("u1"), Result::Sent);
    EXPECT_EQ(m_port.TakeOne(), R"({"msgType":"updateOpenID","exdata":{"openID":"u1","hublinkVersion":""}})");
    EXPECT_EQ(m_reporter.Event("B1", {}, m_time), Result::Sent);
    EXPECT_EQ(m_port.TakeOne(), Report(R"("B1")")) << "and not again";
}

TEST_F(ClientEvent, AUserThatTheServiceCouldNotUseIsRefused) {
    EXPECT_EQ(m_reporter.SetUser("it's"), Result::QuoteInUser);
    EXPECT_EQ(m_reporter.SetUser("u1", "5'"), Result::QuoteInUser);
    EXPECT_EQ(m_reporter.SetUser("\xff"), Result::InvalidText);
    EXPECT_EQ(m_reporter.SetUser("u1", std::string_view("\0", 1)), Result::InvalidText);
    EXPECT_EQ(m_reporter.SetUser("", "5.1"), Result::InvalidText);
    EXPECT_EQ(m_reporter.SetUser(std::string(11'000, 'u')), Result::TooLong);
    EXPECT_EQ(m_reporter.Event("B1", {}, m_time), Result::Sent);
    EXPECT_EQ(m_port.TakeOne(), Report(R"("B1")"));
}

TEST_F(ClientEvent, EachResultIsCounted) {
    m_reporter.Event("B1");
    m_reporter.Event("B1");
    m_reporter.Event("");
    m_reporter.SetUser("it's");
    EXPECT_EQ(m_reporter.Count(Result::Sent), 2U);
    EXPECT_EQ(m_reporter.Count(Result::InvalidEventId), 1U);
    EXPECT_EQ(m_reporter.Count(Result::QuoteInUser), 1U);
    EXPECT_EQ(m_reporter.Count(Result::TooLong), 0U);
    EXPECT_EQ(m_reporter.Count(static_cast<Result>(99)), 0U);
    EXPECT_STREQ(hublink::ToString(Result::OtherUsersService), "OtherUsersService");
    EXPECT_STREQ(hublink::ToString(static_cast<Result>(99)), "Unknown");
}
