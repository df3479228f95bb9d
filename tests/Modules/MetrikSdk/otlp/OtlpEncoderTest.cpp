#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"

#include <gtest/gtest.h>
#include <rapidjson/document.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "Modules/MetrikSdk/otlp/InstanceId.h"
#include "Modules/MetrikSdk/otlp/Payload.h"

using namespace MetrikSdk;

namespace {

const WallTime STORED{std::chrono::milliseconds(1'800'000'000'007)};

constexpr const char* OUTBOX = "01890000-0000-7000-8000-0000000000aa";

StoredEvent Event(const std::string& payload) {
    StoredEvent event;
    event.uuid = "01890000-0000-7000-8000-000000000001";
    event.release = 1;
    event.sequence = 42;
    event.eventId = "A759|10001";
    event.payload = payload;
    event.storedAt = STORED;
    return event;
}

Batch One(const std::string& payload) {
    Batch batch;
    batch.outboxId = OUTBOX;
    batch.events.push_back(Event(payload));
    batch.releases[1] = {"A759", "1", "default"};
    return batch;
}

std::string Text(const rapidjson::Value& value) {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    value.Accept(writer);
    return buffer.GetString();
}

rapidjson::Document Parsed(const Batch& batch, const otlp::ResourceConfig& config = {}) {
    rapidjson::Document document;
    const auto body = otlp::EncodeOtlp(batch, config);
    document.Parse<rapidjson::kParseValidateEncodingFlag>(body.data(), body.size());
    EXPECT_FALSE(document.HasParseError()) << body;
    return document;
}

/// A member of the first log record of the first resource.
std::string Record(const Batch& batch, const char* member) {
    auto document = Parsed(batch);
    return Text(document["resourceLogs"][0]["scopeLogs"][0]["logRecords"][0][member]);
}

std::string Body(const std::string& payload) {
    return Record(One(payload), "body");
}

TEST(OtlpEncoder, BoundsATimeThatDoesNotFitTheProtocol) {
    auto batch = One("{}");
    batch.events[0].storedAt = WallTime::max();
    EXPECT_EQ(Record(batch, "observedTimeUnixNano"), R"("9223372036854000000")");
    batch.events[0].storedAt = WallTime::min();
    EXPECT_EQ(Record(batch, "observedTimeUnixNano"), R"("0")");
}

TEST(OtlpEncoder, WritesOneResourceForAModule) {
    otlp::ResourceConfig config;
    config.osType = "linux";
    config.osDescription = "Debian";
    config.attributes = {{"host.name", "desk7"}, {"service.version", "not ours"}};
    auto document = Parsed(One("{}"), config);
    EXPECT_EQ(
        Text(document["resourceLogs"][0]["resource"]),
        R"({"attributes":[{"key":"service.name","value":{"stringValue":"default"}},)"
        R"({"key":"service.namespace","value":{"stringValue":"hublink"}},)"
        R"({"key":"service.version","value":{"stringValue":"1"}},)"
        R"({"key":"service.instance.id","value":{"stringValue":"4f89d64b-99a6-5c22-87bc-a222f11717ed"}},)"
        R"({"key":"os.type","value":{"stringValue":"linux"}},)"
        R"({"key":"os.description","value":{"stringValue":"Debian"}},)"
        R"({"key":"metrik.outbox.id","value":{"stringValue":"01890000-0000-7000-8000-0000000000aa"}},)"
        R"({"key":"host.name","value":{"stringValue":"desk7"}}]})");
    for (const char* level : {"resourceLogs", "scopeLogs"}) {
        const auto& logs = document["resourceLogs"][0];
        const auto& part = std::string_view(level) == "scopeLogs" ? logs["scopeLogs"][0] : logs;
        EXPECT_EQ(Text(part["schemaUrl"]), R"("https://opentelemetry.io/schemas/1.30.0")") << level;
    }
}

TEST(OtlpEncoder, CallsEveryModuleByTheNameOfTheEnvironment) {
    otlp::ResourceConfig config;
    config.serviceName = "desk";
    auto document = Parsed(One("{}"), config);
    EXPECT_EQ(Text(document["resourceLogs"][0]["resource"]["attributes"][0]["value"]),
              R"({"stringValue":"desk"})");
}

TEST(OtlpEncoder, TellsModulesAndInstallationsApart) {
    EXPECT_EQ(otlp::InstanceId("6ba7b810-9dad-11d1-80b4-00c04fd430c8", "python.org"),
              "886313e1-3b8a-5372-9b90-0c9aee199e5d")
        << "the known value of version 5";
    EXPECT_NE(otlp::InstanceId(OUTBOX, "A759"), otlp::InstanceId(OUTBOX, "B7"));
    EXPECT_NE(otlp::InstanceId("edited", "A759"), otlp::InstanceId("otherwise", "A759"));
}

TEST(OtlpEncoder, GroupsEventsByModuleAndKeepsTheirOrder) {
    auto batch = One("{}");
    batch.releases[2] = {"B1", "2", ""};
    for (const std::int64_t release : {2, 1, 2}) {
        batch.events.push_back(Event("{}"));
        batch.events.back().release = release;
        batch.events.back().sequence = static_cast<std::int64_t>(batch.events.size());
    }
    auto document = Parsed(batch);
    ASSERT_EQ(document["resourceLogs"].Size(), 2U);
    const auto& second = document["resourceLogs"][1];
    EXPECT_EQ(Text(second["resource"]["attributes"][0]["value"]), R"({"stringValue":"B1"})")
        << "a module without a name is called by its id";
    const auto& records = second["scopeLogs"][0]["logRecords"];
    ASSERT_EQ(records.Size(), 2U);
    EXPECT_EQ(Text(records[0]["attributes"][1]["value"]), R"({"intValue":"2"})");
    EXPECT_EQ(Text(records[1]["attributes"][1]["value"]), R"({"intValue":"4"})");
}

TEST(OtlpEncoder, WritesTimesAsDecimalTextsInNanoseconds) {
    const auto batch = One(R"({"extend":{"createTime":"1700000000123"}})");
    EXPECT_EQ(Record(batch, "timeUnixNano"), R"("1700000000123000000")");
    EXPECT_EQ(Record(batch, "observedTimeUnixNano"), R"("1800000000007000000")");
}

TEST(OtlpEncoder, FallsBackToTheTimeOfStoringForACreateTimeThatMakesNoSense) {
    for (const auto* bad :
         {"{}", R"({"extend":7})", R"({"extend":{}})", R"({"extend":{"createTime":1700000000123}})",
          R"({"extend":{"createTime":""}})", R"({"extend":{"createTime":"yesterday"}})",
          R"({"extend":{"createTime":"-5"}})", R"({"extend":{"createTime":"12 "}})",
          R"({"extend":{"createTime":"99999999999999999999999"}})",
          R"({"extend":{"createTime":"9223372036855"}})", "not json"})
        EXPECT_EQ(Record(One(bad), "timeUnixNano"), R"("1800000000007000000")") << bad;
}

/// The attributes after those that every record has.
std::string FurtherAttributes(const std::string& payload) {
    constexpr auto LAST = R"({"key":"metrik.event","value":{"stringValue":"A759|10001"}})";
    const auto text = Record(One(payload), "attributes");
    return text.substr(text.find(LAST) + std::string_view(LAST).size());
}

TEST(OtlpEncoder, NamesTheEventAndCarriesWhatIdentifiesIt) {
    EXPECT_EQ(Record(One("{}"), "eventName"), R"("A759|10001")");
    EXPECT_EQ(Record(One("{}"), "severityNumber"), "9");
    EXPECT_EQ(Record(One("{}"), "severityText"), R"("INFO")");
    EXPECT_EQ(Record(One("{}"), "attributes"),
              R"([{"key":"log.record.uid","value":{"stringValue":"01890000-0000-7000-8000-000000000001"}},)"
              R"({"key":"metrik.sequence","value":{"intValue":"42"}},)"
              R"({"key":"metrik.module","value":{"stringValue":"A759"}},)"
              R"({"key":"metrik.event","value":{"stringValue":"A759|10001"}}])");
}

TEST(OtlpEncoder, MakesAttributesOfWhatIsWorthAColumn) {
    EXPECT_EQ(
        FurtherAttributes(R"({"extend":{"hublinkVersion":"5.1"},"eventData":{"openid":"u1","clicks":3,)"
                          R"("ratio":0.5,"on":true,"none":null,"deep":{"a":1},"list":[1],"clicks":4,"":5,)"
                          R"("big":18446744073709551615}})"),
        R"(,{"key":"user.id","value":{"stringValue":"u1"}},)"
        R"({"key":"hublink.version","value":{"stringValue":"5.1"}},)"
        R"({"key":"metrik.data.openid","value":{"stringValue":"u1"}},)"
        R"({"key":"metrik.data.clicks","value":{"intValue":"3"}},)"
        R"({"key":"metrik.data.ratio","value":{"doubleValue":0.5}},)"
        R"({"key":"metrik.data.on","value":{"boolValue":true}},)"
        R"({"key":"metrik.data.big","value":{"stringValue":"18446744073709551615"}}])");
    for (const auto* nothing : {R"({"eventData":7})", R"({"extend":{"hublinkVersion":5}})", "[]", "no json"})
        EXPECT_EQ(FurtherAttributes(nothing), "]") << nothing;
}

TEST(OtlpEncoder, BoundsTheNumberAndTheNamesOfAttributes) {
    std::string members = "\"" + std::string(129, 'n') + "\":1";
    for (int i = 0; i < 100; ++i)
        members += ",\"m" + std::to_string(i) + "\":1";
    const auto payload = "{\"eventData\":{" + members + "}}";
    const auto attributes = FurtherAttributes(payload);
    EXPECT_EQ(attributes.find("nnn"), std::string::npos);
    EXPECT_NE(attributes.find("metrik.data.m63\""), std::string::npos);
    EXPECT_EQ(attributes.find("metrik.data.m64\""), std::string::npos);
    EXPECT_NE(Body(payload).find("\"m99\""), std::string::npos) << "the body has all";
}

TEST(OtlpEncoder, WritesThePayloadAsAStructure) {
    EXPECT_EQ(
        Body(R"({"a":{"b":[1,"x",null,true]},"c":1.5})"),
        R"({"kvlistValue":{"values":[{"key":"a","value":{"kvlistValue":{"values":[{"key":"b","value":)"
        R"({"arrayValue":{"values":[{"intValue":"1"},{"stringValue":"x"},{},{"boolValue":true}]}}}]}}},)"
        R"({"key":"c","value":{"doubleValue":1.5}}]}})");
}

TEST(OtlpEncoder, KeepsEveryDigitOfA64BitInteger) {
    EXPECT_NE(Body(R"({"a":-9223372036854775808})").find(R"({"intValue":"-9223372036854775808"})"),
              std::string::npos);
    EXPECT_NE(Body(R"({"a":9223372036854775807})").find(R"({"intValue":"9223372036854775807"})"),
              std::string::npos);
    EXPECT_NE(Body(R"({"a":18446744073709551615})").find(R"({"stringValue":"18446744073709551615"})"),
              std::string::npos);
}

TEST(OtlpEncoder, ReadsZeroWhateverItsExponent) {
    EXPECT_EQ(Body(R"({"a":0e309})"),
              R"({"kvlistValue":{"values":[{"key":"a","value":{"doubleValue":0.0}}]}})");
}

TEST(OtlpEncoder, KeepsTheFirstOfSeveralMembersWithOneKey) {
    EXPECT_EQ(Body(R"({"a":1,"a":2,"":3})"),
              R"({"kvlistValue":{"values":[{"key":"a","value":{"intValue":"1"}},)"
              R"({"key":"","value":{"intValue":"3"}}]}})");
}

TEST(OtlpEncoder, SendsWhatIsNoJsonObjectAsText) {
    for (const std::string text : {"", "plain", "[1]", "7", "{\"a\":", "{} {}"})
        EXPECT_EQ(Body(text).substr(0, 15), R"({"stringValue":)") << text;
    EXPECT_EQ(Body(std::string("{}\0{}", 5)), R"({"stringValue":"{}\u0000{}"})");
}

TEST(OtlpEncoder, SendsADeepPayloadAsText) {
    const auto nested = [](int depth) {
        std::string text;
        for (int i = 0; i < depth; ++i)
            text += R"({"a":)";
        return text + "1" + std::string(static_cast<std::size_t>(depth), '}');
    };
    EXPECT_EQ(Body(nested(otlp::Payload::MAX_DEPTH)).substr(0, 15), R"({"kvlistValue":)");
    EXPECT_EQ(Body(nested(otlp::Payload::MAX_DEPTH + 1)).substr(0, 15), R"({"stringValue":)");
    EXPECT_EQ(Body(std::string(100'000, '[')).substr(0, 15), R"({"stringValue":)");
}

TEST(OtlpEncoder, KeepsTheTimeAndTheAttributesOfADeepPayload) {
    for (const int depth : {23, 24, 100, 127}) {
        const auto brackets = static_cast<std::size_t>(depth);
        const auto payload = R"({"extend":{"createTime":"1700000000123"},"eventData":{"clicks":3,"deep":)" +
                             std::string(brackets, '[') + std::string(brackets, ']') + "}}";
        EXPECT_EQ(Record(One(payload), "timeUnixNano"), R"("1700000000123000000")") << depth;
        EXPECT_NE(FurtherAttributes(payload).find("metrik.data.clicks"), std::string::npos) << depth;
        EXPECT_EQ(Body(payload).substr(0, 15), R"({"stringValue":)") << depth;
    }
}

TEST(OtlpEncoder, ReplacesWhatIsNotUtf8) {
    auto batch = One("{\"a\":\"\xff\"}");
    batch.events[0].eventId = "A\xc3";
    batch.releases[1].name = "n\xed\xa0\x80";
    Parsed(batch);
    EXPECT_EQ(Record(batch, "body"), "{\"stringValue\":\"{\\\"a\\\":\\\"\xef\xbf\xbd\\\"}\"}");
    EXPECT_EQ(Record(batch, "eventName"), "\"A\xef\xbf\xbd\"");
}

TEST(OtlpEncoder, ReadsNumbersAsTheServiceDoes) {
    EXPECT_EQ(Body(R"({"a":1.84467440737095516155})"),
              R"({"kvlistValue":{"values":[{"key":"a","value":{"doubleValue":1.8446744073709552}}]}})");
    EXPECT_EQ(Body(R"({"a":17976931348623159e292})").substr(0, 15), R"({"stringValue":)");
}

TEST(OtlpEncoder, SendsALoneSurrogateAsText) {
    EXPECT_EQ(Body(R"({"a":"\ud800"})").substr(0, 15), R"({"stringValue":)");
}

} // namespace
