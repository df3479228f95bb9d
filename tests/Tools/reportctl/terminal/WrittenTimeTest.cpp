#include "Tools/reportctl/terminal/WrittenTime.h"

#include <cstdlib>
#include <ctime>

#include <gtest/gtest.h>

namespace {

using namespace reportctl::terminal;

class WrittenTime : public testing::Test {
protected:
    static void UseZone(const char* zone) {
        ::setenv("TZ", zone, 1);
        ::tzset();
    }
    void TearDown() override {
        ::unsetenv("TZ");
        ::tzset();
    }

    const TimePoint m_time = At(1'763'733'906'789);
};

TEST_F(WrittenTime, IsInUtcForPrograms) {
    UseZone("CET-1");
    EXPECT_EQ(UtcTime(m_time), "2025-11-21T14:05:06.789Z");
}

TEST_F(WrittenTime, HasTheOffsetOfItsZone) {
    UseZone("CET-1");
    EXPECT_EQ(ZonedTime(m_time), "2025-11-21T15:05:06.789+01:00");
    UseZone("NST3:30");
    EXPECT_EQ(ZonedTime(m_time), "2025-11-21T10:35:06.789-03:30");
}

TEST_F(WrittenTime, IsLocalForAPerson) {
    UseZone("CET-1");
    EXPECT_EQ(LocalTime(m_time), "2025-11-21 15:05:06.789");
}

TEST_F(WrittenTime, MayBeBefore1970) {
    UseZone("UTC");
    EXPECT_EQ(UtcTime(At(-1)), "1969-12-31T23:59:59.999Z");
    EXPECT_EQ(LocalTime(At(-1)), "1969-12-31 23:59:59.999");
}

} // namespace
