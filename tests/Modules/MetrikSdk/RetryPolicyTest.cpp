#include "Modules/MetrikSdk/RetryPolicy.h"

#include <gtest/gtest.h>

using namespace Metrik;
using namespace std::chrono_literals;
using RetryPolicy::Judge;

namespace {

/// Tue, 21 Nov 2023 08:00:00 GMT
const WallTime NOW{1'700'553'600s};

HttpResult Answer(long status, const std::string& body = {}) {
    HttpResult result;
    result.status = status;
    result.body = body;
    return result;
}

TEST(RetryPolicy, DeletesWhatWasTaken) {
    for (const long status : {200, 202, 204})
        EXPECT_EQ(Judge(Answer(status)), Verdict::Delete) << status;
}

TEST(RetryPolicy, KeepsTheBatchWhereTheCollectorAsksToWait) {
    for (const long status : {429, 502, 503, 504})
        EXPECT_EQ(Judge(Answer(status)), Verdict::Wait) << status;
}

TEST(RetryPolicy, HalvesOnEveryOtherError) {
    for (const long status : {400, 401, 404, 408, 413, 422, 499, 500, 501, 505, 599})
        EXPECT_EQ(Judge(Answer(status)), Verdict::Halve) << status;
}

TEST(RetryPolicy, KeepsTheBatchOnARedirect) {
    for (const long status : {301, 302, 307, 308})
        EXPECT_EQ(Judge(Answer(status)), Verdict::Wait) << status;
}

TEST(RetryPolicy, KeepsTheBatchWhenTheAnswerIsNotComplete) {
    auto cut = Answer(200);
    cut.fault = "transfer closed";
    EXPECT_EQ(Judge(cut), Verdict::Wait);
}

TEST(RetryPolicy, TakesAWebPageForALogInPage) {
    auto page = Answer(200, "<html>Welcome to the hotel</html>");
    for (const auto* type : {"text/html; charset=utf-8", "Text/HTML"}) {
        page.contentType = type;
        EXPECT_EQ(Judge(page), Verdict::Wait) << type;
    }
}

TEST(RetryPolicy, JudgesAnErrorByItsStatusAlsoWhenItsTextIsAPage) {
    const auto judge = [](long status) {
        auto page = Answer(status, "<html>Error</html>");
        page.contentType = "text/html";
        return Judge(page);
    };
    for (const long status : {400, 401, 413, 500})
        EXPECT_EQ(judge(status), Verdict::Halve) << status;
    for (const long status : {302, 429, 502, 503, 504})
        EXPECT_EQ(judge(status), Verdict::Wait) << status;
}

TEST(RetryPolicy, TakesAnAnswerThatIsNoJsonForAnAcceptance) {
    EXPECT_EQ(Judge(Answer(200, "ok")), Verdict::Delete);
}

TEST(RetryPolicy, ReadsThePartialSuccess) {
    const auto read = [](const std::string& body) {
        return RetryPolicy::ReadPartialSuccess(Answer(200, body), 10);
    };
    EXPECT_EQ(read(R"({"partialSuccess":{"rejectedLogRecords":"3","errorMessage":"too old"}})").rejected, 3U);
    EXPECT_EQ(read(R"({"partialSuccess":{"rejectedLogRecords":"3","errorMessage":"too\nold"}})").message,
              "too old");
    EXPECT_EQ(read(R"({"partialSuccess":{"rejectedLogRecords":4}})").rejected, 4U);
    EXPECT_EQ(read(R"({"partialSuccess":{"rejectedLogRecords":"9999999999999999999"}})").rejected, 10U);
    for (const auto* nothing : {"", "{}", "ok", "[]", R"({"partialSuccess":{}})", R"({"partialSuccess":7})",
                                R"({"partialSuccess":{"rejectedLogRecords":-1}})"})
        EXPECT_EQ(read(nothing).rejected, 0U) << nothing;
}

TEST(RetryPolicy, UnderstandsRetryAfterInSeconds) {
    EXPECT_EQ(RetryPolicy::ParseRetryAfter("120", NOW), 120s);
    EXPECT_EQ(RetryPolicy::ParseRetryAfter("0", NOW), 0s);
    EXPECT_EQ(RetryPolicy::ParseRetryAfter("-5", NOW), 0s);
    EXPECT_GT(RetryPolicy::ParseRetryAfter("99999999999999999999", NOW), 24h);
    EXPECT_GT(RetryPolicy::ParseRetryAfter("9223372036854775807", NOW), 24h);
}

TEST(RetryPolicy, UnderstandsRetryAfterAsADate) {
    EXPECT_EQ(RetryPolicy::ParseRetryAfter("Tue, 21 Nov 2023 08:02:00 GMT", NOW), 120s);
    EXPECT_EQ(RetryPolicy::ParseRetryAfter("Tue, 21 Nov 2023 07:00:00 GMT", NOW), 0s);
}

TEST(RetryPolicy, BoundsARetryAfterOfAHostileYear) {
    for (const auto* date : {"Tue, 21 Nov 2147483647 08:00:00 GMT", "Tue, 21 Nov 292277026 08:00:00 GMT"}) {
        const auto wait = RetryPolicy::ParseRetryAfter(date, NOW);
        EXPECT_TRUE(!wait || *wait > 24h) << date;
        EXPECT_TRUE(!wait || *wait < 24h * 366 * 100) << date;
    }
    EXPECT_GT(RetryPolicy::ParseRetryAfter("Tue, 21 Nov 2147483647 08:00:00 GMT", NOW).value_or(0ms), 24h);
}

TEST(RetryPolicy, IgnoresARetryAfterThatIsNeither) {
    EXPECT_EQ(RetryPolicy::ParseRetryAfter("", NOW), std::nullopt);
    EXPECT_EQ(RetryPolicy::ParseRetryAfter("soon", NOW), std::nullopt);
}

TEST(RetryPolicy, WaitsExponentiallyWithFullJitterUpToTheBound) {
    const RetrySettings settings;
    const auto wait = [&](int failures, double random) {
        return RetryPolicy::WaitBefore(Answer(503), failures, random, NOW, settings);
    };
    EXPECT_EQ(wait(1, 0.0), 0ms);
    EXPECT_EQ(wait(1, 0.5), 500ms);
    EXPECT_EQ(wait(4, 0.5), 4s);
    EXPECT_EQ(wait(9, 1.0), 256s);
    EXPECT_EQ(wait(10, 1.0), 5min);
    EXPECT_EQ(wait(1'000'000, 1.0), 5min);
}

TEST(RetryPolicy, HonoursRetryAfterUpToADayAndNeverWaitsLessForIt) {
    const auto wait = [](const std::string& header, double random) {
        auto result = Answer(503);
        result.retryAfter = header;
        return RetryPolicy::WaitBefore(result, 1, random, NOW, RetrySettings());
    };
    EXPECT_EQ(wait("30", 0.9), 30s);
    EXPECT_EQ(wait("Tue, 21 Nov 2023 08:00:40 GMT", 0.9), 40s);
    EXPECT_EQ(wait("99999999", 0.9), 24h);
    EXPECT_EQ(wait("0", 0.9), 900ms);
}

TEST(RetryPolicy, DescribesAnAnswerInOneShortLine) {
    EXPECT_EQ(RetryPolicy::Describe(Answer(400, R"({"code":3,"message":"bad\nbody"})")),
              "HTTP status 400: bad body");
    EXPECT_EQ(RetryPolicy::Describe(Answer(500)), "HTTP status 500");
    EXPECT_LT(RetryPolicy::Describe(Answer(500, std::string(100'000, '\n'))).size(), 400U);
}

} // namespace
