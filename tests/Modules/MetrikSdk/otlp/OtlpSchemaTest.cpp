#include <cstdlib>
#include <fstream>

#include "Modules/MetrikSdk/otlp/MetricsEncoder.h"
#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"
#include "tests/Modules/MetrikSdk/support/PluginFixture.h"

// Checks request bodies of the plug-in and of reportctl against the protocol's own definition.

using namespace MetrikSdk;

namespace {

class TheOtlpSchema : public PluginFixture {
protected:
    /// Whether the body conforms to the definition.
    bool Passes(const std::string& body) {
        const auto file = m_files.Path() + "/" + std::to_string(m_count++) + ".json";
        std::ofstream(file) << body;
        return std::system(("node '" OTLP_SCHEMA_DIR "/check.js' '" + file + "'").c_str()) == 0;
    }

    /// The bodies with which the plug-in sends the events. There is one body, unless the machine is slow.
    std::vector<std::string> BodiesOf(const std::vector<std::string>& payloads) {
        LoopbackServer server([](const Request&) { return Reply(); });
        Configure("ENDPOINT", server.Url());
        Start();
        for (const auto& payload : payloads)
            EXPECT_TRUE(m_loader->GetModule()->ReportEvent("A759|10001", payload));
        EXPECT_TRUE(WaitUntilNothingWaits());
        Stop();
        const auto requests = server.Requests();
        std::vector<std::string> bodies;
        for (const auto& request : requests)
            bodies.push_back(request.body);
        return bodies;
    }

    static std::string Replaced(std::string body, const std::string& from, const std::string& to) {
        const auto place = body.find(from);
        EXPECT_NE(place, std::string::npos) << from;
        return body.replace(place, from.size(), to);
    }

    TemporaryDirectory m_files;
    int m_count = 0;
};

TEST_F(TheOtlpSchema, AcceptsThePluginsRequests) {
    SetVariable("OTEL_SERVICE_NAME", "desk");
    SetVariable("OTEL_RESOURCE_ATTRIBUTES", "host.name=desk%207,deployment.environment.name=test");
    const auto bodies = BodiesOf({
        NumberedPayload(1),
        R"({"extend":{"createTime":"1700000000123"},"eventData":{"a":[1,-2.5,"x",null,true,{"b":{}},[]]}})",
        R"({"extend":{"hublinkVersion":"5.1"},"eventData":{"openid":"u1","n":18446744073709551615,"r":0.5}})",
        R"({"big":9223372036854775807,"small":-9223372036854775808,"over":18446744073709551615})",
        R"({"twice":1,"twice":2,"":"empty key","nul":"\u0000","e":"\u20ac\ud83d\ude00"})",
        "not json at all",
        "{\"bad utf8\":\"\xff\xfe\"}",
        "",
        std::string(5000, '['),
    });
    std::size_t events = 0;
    for (const auto& body : bodies) {
        EXPECT_TRUE(Passes(body));
        EXPECT_NE(body.find(R"({"key":"host.name","value":{"stringValue":"desk 7"}})"), std::string::npos);
        for (auto at = body.find("\"eventName\":"); at != std::string::npos;
             at = body.find("\"eventName\":", at + 1))
            ++events;
    }
    EXPECT_EQ(events, 9U);
}

TEST_F(TheOtlpSchema, AcceptsARowOfTheStore) {
    const StoredEvent row{.row = -7,
                          .uuid = "0190b6a2-6f1e-7c55-9a3e-5d1c1f0a7b42",
                          .release = 1,
                          .eventId = "B100|1",
                          .payload = NumberedPayload(1),
                          .storedAt = {},
                          .source = Source::Store};
    const Batch batch{.outboxId = "o", .events = {row}, .releases = {{1, {"store", "1", "Report"}}}};
    EXPECT_TRUE(Passes(otlp::EncodeOtlp(batch)));
}

TEST_F(TheOtlpSchema, AcceptsMetricsAndNoticesWhatIsWrongInThem) {
    const WallTime since{std::chrono::hours(1)};
    const auto body = otlp::EncodeMetrics(
        {{"a.sum", "what it is", "{report}", since, {{{{"reason", "x"}}, std::int64_t{1} << 62}}},
         {"a.sum.since.ever", "", "By", WallTime(), {{{}, std::int64_t{0}}}},
         {"a.gauge", "\xff", "s", std::nullopt, {{{}, 1.5}, {{{"k", "v"}}, std::int64_t{-1}}}}},
        {"0190b6a2-6f1e-7c55-9a3e-5d1c1f0a7b42", {"store", "1", "Report"}, since + std::chrono::seconds(1)});
    EXPECT_TRUE(Passes(body));
    EXPECT_FALSE(Passes(Replaced(body, "isMonotonic", "isMonotone")));
    EXPECT_FALSE(
        Passes(Replaced(body, R"("aggregationTemporality":2)", R"("aggregationTemporality":"two")")));
    EXPECT_FALSE(Passes(Replaced(body, R"("asInt":"0")", R"("asInt":0)"))) << "a number for a text";
    EXPECT_FALSE(Passes(Replaced(body, R"("startTimeUnixNano")", R"("startTime")")));
}

TEST_F(TheOtlpSchema, NoticesABodyThatIsWrong) {
    const auto good = BodiesOf({NumberedPayload(1)}).at(0);
    EXPECT_TRUE(Passes(good));
    EXPECT_FALSE(Passes("{"));
    EXPECT_FALSE(Passes(Replaced(good, "eventName", "event_nome"))) << "a member that does not exist";
    EXPECT_FALSE(Passes(Replaced(good, R"("timeUnixNano":"1700000000123000000")", R"("timeUnixNano":1.5)")));
    EXPECT_FALSE(Passes(Replaced(good, R"("intValue":"1")", R"("intValue":1)"))) << "a number for a text";
    EXPECT_FALSE(Passes(Replaced(good, R"("intValue":"1")", R"("intValue":"one")")));
    EXPECT_FALSE(Passes(Replaced(good, R"("severityNumber":9)", R"("severityNumber":"nine")")));
    EXPECT_FALSE(Passes(Replaced(good, "schemaUrl", "schemaURL")));
    EXPECT_FALSE(Passes(Replaced(good, R"("metrik.module")", "7"))) << "a key that is no text";
    EXPECT_FALSE(Passes(Replaced(good, "kvlistValue", "kvListValue"))) << "a body of no type";
    EXPECT_FALSE(Passes(Replaced(good, R"({"stringValue":"u1"})", R"("u1")"))) << "a value without its type";
}

} // namespace
