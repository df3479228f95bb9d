#include "Modules/MetrikSdk/upload/RetryPolicy.h"

#include <gtest/gtest.h>

using namespace MetrikSdk;
using namespace std::chrono_literals;
using upload::RetryPolicy::Judge;

namespace {

/// Tue, 21 Nov 2023 08:00:00 GMT
const WallTime NOW{1'700'553'600s};

otlp::HttpResult Answer(long status, const std::string& body = {}) {
    otlp::HttpResult result;
    result.status = status;
    result.body = body;
    return result;
}

TEST(RetryPolicy, DeletesWhatWasTaken) {
    for (const long status : {200, 202, 204})
        EXPECT_EQ(Judge(Answer(status)), upload::Verdict::Delete) << status;
}

TEST(RetryPolicy, KeepsTheBatchWhereTheCollectorAsksToWait) {
    for (const long status : {429, 502, 503, 504})
        EXPECT_EQ(Judge(Answer(status)), upload::Verdict::WaitThenHalve) << status;
}

TEST(RetryPolicy, BlamesNoEventForAWrongConfigurationAndSaysWhatToLookAt) {
    const std::vector<std::string> headers{"api-key", "x-tenant"};
    const auto lookAt = [&](long status) { return upload::RetryPolicy::LookAt(Answer(status), headers); };
    for (const long status : {401, 403, 404, 405, 407, 415, 511}) {
        EXPECT_EQ(Judge(Answer(status)), upload::Verdict::WaitThenHalve) << status;
        EXPECT_NE(lookAt(status), "") << status;
    }
    EXPECT_EQ(lookAt(401), "look at the credentials: OTEL_EXPORTER_OTLP_HEADERS sets api-key, x-tenant");
    EXPECT_EQ(upload::RetryPolicy::LookAt(Answer(403), {}),
              "look at the credentials: OTEL_EXPORTER_OTLP_HEADERS names no header");
    EXPECT_EQ(lookAt(404), "look at the address: OTEL_EXPORTER_OTLP_ENDPOINT");
    EXPECT_EQ(lookAt(308), lookAt(404));
    for (const long status : {200, 400, 413, 422, 429, 500, 503})
        EXPECT_EQ(lookAt(status), "") << status;
}

TEST(RetryPolicy, NamesTheVariablesThatAreUsed) {
    const otlp::VariableNames names{"A_ENDPOINT", "A_HEADERS", "A_COMPRESSION"};
    const auto lookAt = [&](long status) {
        return upload::RetryPolicy::LookAt(Answer(status), {"api-key"}, names);
    };
    EXPECT_EQ(lookAt(401), "look at the credentials: A_HEADERS sets api-key");
    EXPECT_EQ(lookAt(404), "look at the address: A_ENDPOINT");
    EXPECT_EQ(lookAt(415), "look at A_COMPRESSION: the collector may not unpack, or take no JSON");
}

TEST(RetryPolicy, LearnsALengthFromAnAnswerThatSaysTooLarge) {
    EXPECT_EQ(Judge(Answer(413)), upload::Verdict::HalveForSize);
}

TEST(RetryPolicy, HalvesOnEveryOtherError) {
    for (const long status : {400, 408, 422, 499, 500, 501, 505, 599})
        EXPECT_EQ(Judge(Answer(status)), upload::Verdict::Halve) << status;
}

TEST(RetryPolicy, KeepsTheBatchOnARedirect) {
    for (const long status : {301, 302, 307, 308})
        EXPECT_EQ(Judge(Answer(status)), upload::Verdict::WaitThenHalve) << status;
}

TEST(RetryPolicy, KeepsTheBatchWhenTheAnswerIsNotComplete) {
    auto cut = Answer(200);
    cut.fault = "transfer closed";
    EXPECT_EQ(Judge(cut), upload::Verdict::Wait) << "nothing of the batch had left";
    cut.began = true;
    EXPECT_EQ(Judge(cut), upload::Verdict::WaitAndHalve);
}

TEST(RetryPolicy, TakesAWebPageForALogInPage) {
    auto page = Answer(200, "<html>Welcome to the hotel</html>");
    for (const auto* type : {"text/html; charset=utf-8", "Text/HTML"}) {
        page.contentType = type;
        EXPECT_EQ(Judge(page), upload::Verdict::WaitThenHalve) << type;
    }
}

TEST(RetryPolicy, KnowsAWebPageByItsTextWhereNoTypeSaysSo) {
    for (const auto* text : {"<html>Welcome</html>", "\r\n\t <!DOCTYPE html>", "\xef\xbb\xbf<html>"}) {
        EXPECT_EQ(Judge(Answer(200, text)), upload::Verdict::WaitThenHalve) << text;
        EXPECT_NE(upload::RetryPolicy::LookAt(Answer(200, text), {}), "") << text;
    }
    for (const auto* text : {"", "  ", "1 < 2", "{}"})
        EXPECT_EQ(Judge(Answer(200, text)), upload::Verdict::Delete) << text;
}

TEST(RetryPolicy, JudgesAnErrorByItsStatusAlsoWhenItsTextIsAPage) {
    const auto judge = [](long status) {
        auto page = Answer(status, "<html>Error</html>");
        page.contentType = "text/html";
        return Judge(page);
    };
    for (const long status : {400, 500})
        EXPECT_EQ(judge(status), upload::Verdict::Halve) << status;
    EXPECT_EQ(judge(413), upload::Verdict::HalveForSize);
    for (const long status : {302, 401, 403, 429, 502, 503, 504})
        EXPECT_EQ(judge(status), upload::Verdict::WaitThenHalve) << status;
}

TEST(RetryPolicy, TakesAnAnswerThatIsNoJsonForAnAcceptance) {
    EXPECT_EQ(Judge(Answer(200, "ok")), upload::Verdict::Delete);
}

TEST(RetryPolicy, ReadsThePartialSuccess) {
    const auto read = [](const std::string& body) {
        return upload::RetryPolicy::ReadPartialSuccess(Answer(200, body), 10);
    };
    EXPECT_EQ(read(R"({"partialSuccess":{"rejectedLogRecords":"3","errorMessage":"too old"}})").rejected, 3U);
    EXPECT_EQ(read(R"({"partialSuccess":{"rejectedLogRecords":"3","errorMessage":"too\nold"}})").message,
              "too old");
    EXPECT_EQ(read(R"({"partialSuccess":{"rejectedLogRecords":4}})").rejected, 4U);
    EXPECT_EQ(read(R"({"partialSuccess":{"rejectedLogRecords":"9999999999999999999"}})").rejected, 10U);
    for (const auto* nothing : {"", "{}", "ok", "[]", R"({"partialSuccess":{}})", R"({"partialSuccess":7})",
                                R"({"partialSuccess":{"rejectedLogRecords":-1}})"})
        EXPECT_EQ(read(nothing).rejected, 0U) << nothing;
    EXPECT_EQ(read(R"({"partialSuccess":{"errorMessage":"use v2"}})").message, "use v2");
    for (const auto* possible : {"", "{}", "ok", R"({"partialSuccess":{"rejectedLogRecords":"10"}})",
                                 R"({"partialSuccess":{"rejectedLogRecords":0}})"})
        EXPECT_EQ(read(possible).impossible, "") << possible;
    EXPECT_EQ(read(R"({"partialSuccess":{"rejectedLogRecords":"11"}})").impossible, "11");
    EXPECT_EQ(read(R"({"partialSuccess":{"rejectedLogRecords":-1}})").impossible, "-1");
    EXPECT_EQ(read(R"({"partialSuccess":{"rejectedLogRecords":"some"}})").impossible, "some");
}

TEST(RetryPolicy, WaitsExponentiallyWithFullJitterUpToTheBound) {
    const RetrySettings settings;
    const auto wait = [&](int failures, double random) {
        return upload::RetryPolicy::WaitBefore(Answer(503), failures, random, NOW, settings);
    };
    EXPECT_EQ(wait(1, 0.0), 0ms);
    EXPECT_EQ(wait(1, 0.5), 500ms);
    EXPECT_EQ(wait(4, 0.5), 4s);
    EXPECT_EQ(wait(9, 1.0), 256s);
    EXPECT_EQ(wait(10, 1.0), 5min);
    EXPECT_EQ(wait(1'000'000, 1.0), 5min);
}

std::chrono::milliseconds WaitAfter(const std::string& retryAfter, double random) {
    auto result = Answer(503);
    result.retryAfter = retryAfter;
    return upload::RetryPolicy::WaitBefore(result, 1, random, NOW, RetrySettings());
}

TEST(RetryPolicy, HonoursRetryAfterUpToADayAndNeverWaitsLessForIt) {
    EXPECT_EQ(WaitAfter("30", 0.0), 30s);
    EXPECT_EQ(WaitAfter("Tue, 21 Nov 2023 08:00:40 GMT", 0.0), 40s);
    EXPECT_EQ(WaitAfter("99999999", 0.0), 24h);
    EXPECT_EQ(WaitAfter("0", 0.9), 900ms);
}

TEST(RetryPolicy, SpreadsARetryAfterThatAllMachinesWereTold) {
    EXPECT_EQ(WaitAfter("30", 0.5), 45s);
    EXPECT_EQ(WaitAfter("Tue, 21 Nov 2023 08:00:40 GMT", 0.5), 1min);
    EXPECT_EQ(WaitAfter("3600", 0.5), 1h + 150s) << "five minutes are enough";
    EXPECT_EQ(WaitAfter("99999999", 0.5), 24h + 150s);
}

TEST(RetryPolicy, SpreadsTheFirstRequestsOfMachinesThatStartTogether) {
    RetrySettings settings;
    EXPECT_EQ(upload::RetryPolicy::WaitAtStart(0.0, settings), 0ms);
    EXPECT_EQ(upload::RetryPolicy::WaitAtStart(0.5, settings), 30s);
    settings.startSpread = 0ms;
    EXPECT_EQ(upload::RetryPolicy::WaitAtStart(0.9, settings), 0ms);
}

TEST(RetryPolicy, DescribesAnAnswerInOneShortLine) {
    EXPECT_EQ(upload::RetryPolicy::Describe(Answer(400, R"({"code":3,"message":"bad\nbody"})")),
              "HTTP status 400: bad body");
    EXPECT_EQ(upload::RetryPolicy::Describe(Answer(500)), "HTTP status 500");
    EXPECT_LT(upload::RetryPolicy::Describe(Answer(500, std::string(100'000, '\n'))).size(), 400U);
}

} // namespace
