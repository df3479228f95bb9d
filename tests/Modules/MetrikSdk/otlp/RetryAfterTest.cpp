#include "Modules/MetrikSdk/otlp/RetryAfter.h"

#include <gtest/gtest.h>

using namespace MetrikSdk;
using namespace std::chrono_literals;

namespace {

/// Tue, 21 Nov 2023 08:00:00 GMT
const WallTime NOW{1'700'553'600s};

TEST(RetryAfter, UnderstandsSeconds) {
    EXPECT_EQ(otlp::ParseRetryAfter("120", NOW), 120s);
    EXPECT_EQ(otlp::ParseRetryAfter("0", NOW), 0s);
    EXPECT_EQ(otlp::ParseRetryAfter("-5", NOW), 0s);
    EXPECT_GT(otlp::ParseRetryAfter("99999999999999999999", NOW), 24h);
    EXPECT_GT(otlp::ParseRetryAfter("9223372036854775807", NOW), 24h);
}

TEST(RetryAfter, UnderstandsADate) {
    EXPECT_EQ(otlp::ParseRetryAfter("Tue, 21 Nov 2023 08:02:00 GMT", NOW), 120s);
    EXPECT_EQ(otlp::ParseRetryAfter("Tue, 21 Nov 2023 07:00:00 GMT", NOW), 0s);
}

TEST(RetryAfter, BoundsAHostileYear) {
    for (const auto* date : {"Tue, 21 Nov 2147483647 08:00:00 GMT", "Tue, 21 Nov 292277026 08:00:00 GMT"}) {
        const auto wait = otlp::ParseRetryAfter(date, NOW);
        EXPECT_TRUE(!wait || *wait > 24h) << date;
        EXPECT_TRUE(!wait || *wait < 24h * 366 * 100) << date;
    }
    EXPECT_GT(otlp::ParseRetryAfter("Tue, 21 Nov 2147483647 08:00:00 GMT", NOW).value_or(0ms), 24h);
}

TEST(RetryAfter, IgnoresWhatIsNeither) {
    EXPECT_EQ(otlp::ParseRetryAfter("", NOW), std::nullopt);
    EXPECT_EQ(otlp::ParseRetryAfter("soon", NOW), std::nullopt);
}

} // namespace
