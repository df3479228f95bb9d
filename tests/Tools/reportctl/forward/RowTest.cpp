#include "Tools/reportctl/forward/Row.h"

#include <gtest/gtest.h>
#include <rapidjson/document.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"

using reportctl::forward::EventOf;
using reportctl::forward::Row;
using reportctl::forward::UidOf;

namespace {

constexpr auto INSTALLATION = "0190b6a2-6f1e-7c55-9a3e-5d1c1f0a7b42";
const MetrikSdk::WallTime NOW{std::chrono::milliseconds(1'800'000'000'007)};

Row Sample() {
    return {7, "B100|10001", "opened the door", "1700000000123", "5.1.0.2", "u1"};
}

std::string PayloadOf(const Row::Text& value) {
    auto row = Sample();
    row.value = value;
    return EventOf(INSTALLATION, row, NOW).payload;
}

std::string WithData(const std::string& members) {
    return R"({"extend":{"hublinkVersion":"5.1.0.2","createTime":"1700000000123"},"eventData":{)" + members +
           R"("openid":"u1"}})";
}

std::string Text(const rapidjson::Value& value) {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    value.Accept(writer);
    return buffer.GetString();
}

/// The only log record of the row's request.
std::string RecordOf(const Row& row) {
    const auto body =
        MetrikSdk::otlp::EncodeOtlp({.outboxId = INSTALLATION,
                                     .events = {EventOf(INSTALLATION, row, NOW)},
                                     .releases = {{1, {"store", "0.2.0", "SyncServiceReport"}}}});
    rapidjson::Document document;
    document.Parse<rapidjson::kParseValidateEncodingFlag>(body.data(), body.size());
    EXPECT_FALSE(document.HasParseError()) << body;
    return Text(document["resourceLogs"][0]["scopeLogs"][0]["logRecords"][0]);
}

TEST(StoreRow, HasAUidOfItsInstallationItsIdAndAllThatItHolds) {
    const auto uid = UidOf(INSTALLATION, Sample());
    EXPECT_EQ(uid, "74f5d7b0-ca28-5749-a90b-f0c1fbc5f2a1")
        << "a row that was sent by an older version must be known again";
    EXPECT_EQ(UidOf(INSTALLATION, Sample()), uid);
    EXPECT_NE(UidOf("0190b6a2-6f1e-7c55-9a3e-5d1c1f0a7b43", Sample()), uid);
    const auto changed = [](auto change) {
        auto row = Sample();
        change(row);
        return UidOf(INSTALLATION, row);
    };
    EXPECT_NE(changed([](Row& row) { row.id = 8; }), uid);
    EXPECT_NE(changed([](Row& row) { row.eventID = "B100|10002"; }), uid);
    EXPECT_NE(changed([](Row& row) { row.value = ""; }), uid);
    EXPECT_NE(changed([](Row& row) { row.createTime = "1700000000124"; }), uid);
    EXPECT_NE(changed([](Row& row) { row.suiteVersion = "5.1.0.3"; }), uid);
    EXPECT_NE(changed([](Row& row) { row.openid = "u2"; }), uid);
}

TEST(StoreRow, HasAnotherUidForNullThanForAnEmptyTextAndForTextsThatAreDividedElsewhere) {
    auto row = Sample();
    row.value = "";
    const auto empty = UidOf(INSTALLATION, row);
    row.value = std::nullopt;
    EXPECT_NE(UidOf(INSTALLATION, row), empty);
    row.eventID = "B1,1:x";
    row.value = "y";
    const auto one = UidOf(INSTALLATION, row);
    row.eventID = "B1";
    row.value = "x,1:y";
    EXPECT_NE(UidOf(INSTALLATION, row), one);
}

TEST(StoreRow, HasThePayloadOfAnEvent) {
    EXPECT_EQ(PayloadOf("opened the door"), WithData(R"("value":"opened the door",)"));
    EXPECT_EQ(PayloadOf(R"({"clicks":3,"ratio":1.5,"in":{"a":[1]}})"),
              WithData(R"("clicks":3,"ratio":1.5,"in":{"a":[1]},)"));
    EXPECT_EQ(PayloadOf(R"([1,"two"])"), WithData(R"("value":[1,"two"],)"));
    EXPECT_EQ(PayloadOf("12"), WithData(R"("value":"12",)"))
        << "the store does not know a number's text apart";
    EXPECT_EQ(PayloadOf(std::nullopt), WithData(""));
    EXPECT_EQ(PayloadOf(R"({"openid":"forged"})"), WithData("")) << "the row says whose it is";
}

TEST(StoreRow, WithHostileContentsIsStillARecord) {
    EXPECT_EQ(PayloadOf("\xff\xfe"), WithData("\"value\":\"\xef\xbf\xbd\xef\xbf\xbd\","));
    EXPECT_EQ(PayloadOf(std::string("a\0b", 3)), WithData(R"("value":"a\u0000b",)"));
    EXPECT_EQ(PayloadOf(R"({"a":)"), WithData(R"("value":"{\"a\":",)"));
    const std::string deep = std::string(5000, '[') + std::string(5000, ']');
    EXPECT_EQ(PayloadOf(deep), WithData("\"value\":\"" + deep + "\","));
    Row nothing;
    nothing.id = -5;
    EXPECT_NE(RecordOf(nothing).find(R"({"key":"hublink.row","value":{"intValue":"-5"}})"),
              std::string::npos);
    for (const auto& text :
         {std::string("\xff"), std::string("\0", 1), deep, std::string(R"({"":{"":{}}})")}) {
        const Row row{1, text, text, text, text, text};
        EXPECT_NE(RecordOf(row).find("hublink.source"), std::string::npos);
    }
}

TEST(StoreRow, BecomesTheRecordThatTheDocumentShows) {
    EXPECT_EQ(RecordOf(Sample()),
              R"({"timeUnixNano":"1700000000123000000","observedTimeUnixNano":"1800000000007000000",)"
              R"("severityNumber":9,"severityText":"INFO","eventName":"B100|10001",)"
              R"("body":{"kvlistValue":{"values":[{"key":"extend","value":{"kvlistValue":{"values":[)"
              R"({"key":"hublinkVersion","value":{"stringValue":"5.1.0.2"}},)"
              R"({"key":"createTime","value":{"stringValue":"1700000000123"}}]}}},)"
              R"({"key":"eventData","value":{"kvlistValue":{"values":[)"
              R"({"key":"value","value":{"stringValue":"opened the door"}},)"
              R"({"key":"openid","value":{"stringValue":"u1"}}]}}}]}},)"
              R"("attributes":[{"key":"log.record.uid",)"
              R"("value":{"stringValue":"74f5d7b0-ca28-5749-a90b-f0c1fbc5f2a1"}},)"
              R"({"key":"hublink.source","value":{"stringValue":"store"}},)"
              R"({"key":"hublink.row","value":{"intValue":"7"}},)"
              R"({"key":"metrik.module","value":{"stringValue":"B100"}},)"
              R"({"key":"metrik.event","value":{"stringValue":"B100|10001"}},)"
              R"({"key":"user.id","value":{"stringValue":"u1"}},)"
              R"({"key":"hublink.version","value":{"stringValue":"5.1.0.2"}},)"
              R"({"key":"metrik.data.value","value":{"stringValue":"opened the door"}},)"
              R"({"key":"metrik.data.openid","value":{"stringValue":"u1"}}]})");
}

TEST(StoreRow, WithoutATimeHasTheTimeAtWhichItWasObserved) {
    auto row = Sample();
    row.createTime = "yesterday";
    EXPECT_NE(RecordOf(row).find(R"("timeUnixNano":"1800000000007000000")"), std::string::npos);
}

} // namespace
