#include "Tools/reportctl/forward/Metrics.h"

#include <gmock/gmock.h>

#include "Tools/reportctl/status/Names.h"
#include "tests/Tools/reportctl/support/ForwardFixture.h"

using reportctl::forward::MetricsBodyOf;
using reportctl::forward::SendMetrics;
using ::testing::HasSubstr;
using ::testing::Not;

namespace status = reportctl::status;

namespace {

using ForwardMetrics = ForwardFixture;

status::Status Sample() {
    status::Status status;
    status.atMs = 1'700'000'005'000;
    status.ledger.sight = ReportLedger::Sight::Sound;
    status.ledger.begunAtMs = 1'700'000'000'000;
    status.ledger.total[ReportLedger::RECEIVED] = 12;
    status.ledger.total[ReportLedger::QUEUED] = 10;
    status.ledger.total[status::Place(ReportLedger::Outcome::NotJson)] = 2;
    status.outbox.dropped = 3;
    return status;
}

std::string BodyOf(const status::Status& sample) {
    return MetricsBodyOf(sample, status::Judge(sample), "0190b6a2-6f1e-7c55-9a3e-5d1c1f0a7b42", {});
}

TEST_F(ForwardMetrics, AreCumulativeSumsSinceTheLedgerBegan) {
    EXPECT_THAT(
        BodyOf(Sample()),
        HasSubstr(R"({"name":"hublink.report.received",)"
                  R"("description":"Datagrams that the service took from its socket.","unit":"{report}",)"
                  R"("sum":{"aggregationTemporality":2,"isMonotonic":true,"dataPoints":[)"
                  R"({"startTimeUnixNano":"1700000000000000000","timeUnixNano":"1700000005000000000",)"
                  R"("asInt":"12","attributes":[]}]}})"));
}

TEST_F(ForwardMetrics, HaveTheReasonOfARefusalAsAnAttribute) {
    EXPECT_THAT(
        BodyOf(Sample()),
        HasSubstr(R"("asInt":"2","attributes":[{"key":"reason","value":{"stringValue":"notJson"}}])"));
}

TEST_F(ForwardMetrics, AreGaugesWhereTheyMayShrink) {
    EXPECT_THAT(BodyOf(Sample()),
                HasSubstr(R"("name":"hublink.report.waiting","description":"Reports in the queue now.",)"
                          R"("unit":"{report}","gauge":{"dataPoints":[{"timeUnixNano":"1700000005000000000",)"
                          R"("asInt":"10","attributes":[]}]})"));
}

TEST_F(ForwardMetrics, LeaveOutAStartThatIsNotKnown) {
    auto sample = Sample();
    EXPECT_THAT(BodyOf(sample), HasSubstr(R"([{"timeUnixNano":"1700000005000000000","asInt":"3")"));
    sample.outbox.begunAtMs = 1'600'000'000'000;
    EXPECT_THAT(BodyOf(sample), HasSubstr(R"({"startTimeUnixNano":"1600000000000000000",)"
                                          R"("timeUnixNano":"1700000005000000000","asInt":"3")"));
}

TEST_F(ForwardMetrics, LeaveOutWhatIsNotKnown) {
    EXPECT_THAT(BodyOf(status::Status()), Not(HasSubstr("hublink.report.received")));
    EXPECT_THAT(BodyOf(status::Status()), HasSubstr("hublink.report.up"));
}

TEST_F(ForwardMetrics, HaveTheNamesOfThePrometheusFormat) {
    const auto sample = Sample();
    const auto text = status::MetricsOf(sample, status::Judge(sample));
    EXPECT_THAT(text, HasSubstr("# TYPE hublink_report_received_total counter\n"
                                "hublink_report_received_total 12\n"));
    EXPECT_THAT(text, HasSubstr("hublink_report_refused_total{reason=\"notJson\"} 2\n"));
    EXPECT_THAT(text, HasSubstr("hublink_report_outbox_dropped_total 3\n"));
}

TEST_F(ForwardMetrics, SayWhatTheCollectorSays) {
    const auto answered = [&](const MetrikSdk::otlp::HttpResult& result) {
        m_sender.answer = [result](const auto&) { return result; };
        return SendMetrics(m_sender, R"({"resourceLogs":[{"scopeLogs":[{"logRecords":[]}]}]})", 0.5, m_now);
    };
    EXPECT_TRUE(answered(Status(200)).isTaken);
    EXPECT_EQ(answered(Status(200)).remark, "");
    EXPECT_EQ(
        answered(Status(200, R"({"partialSuccess":{"rejectedDataPoints":"2","errorMessage":"old"}})")).remark,
        "the collector rejected 2 figures: old");
    EXPECT_EQ(answered(Status(200, R"({"partialSuccess":{"errorMessage":"slow"}})")).remark,
              "the collector took the figures and says: slow");
    EXPECT_FALSE(answered(Status(401)).isTaken);
    EXPECT_THAT(answered(Status(401)).remark, HasSubstr("sets api-key"));
    for (const long status : {200, 429}) {
        auto answer = Status(status);
        EXPECT_EQ(answered(answer).wishedWait, std::chrono::seconds(0));
        answer.retryAfter = "300";
        EXPECT_EQ(answered(answer).wishedWait, std::chrono::seconds(450)) << "half as long again by chance";
    }
}

} // namespace
