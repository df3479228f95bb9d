#include "Tools/reportctl/terminal/Quantity.h"

#include <gtest/gtest.h>

namespace {

using namespace reportctl::terminal;

TEST(Quantity, OfBytesHasAUnit) {
    EXPECT_EQ(Bytes(9'999), "9999 B");
    EXPECT_EQ(Bytes(10'000), "10.0 KB");
    EXPECT_EQ(Bytes(10'000'000), "10.0 MB");
    EXPECT_EQ(Bytes(10'000'000'000), "10.0 GB");
}

TEST(Quantity, HasCommasAndAPlural) {
    EXPECT_EQ(Number(999), "999");
    EXPECT_EQ(Number(1'234'567), "1,234,567");
    EXPECT_EQ(Counted(1, "error"), "1 error");
    EXPECT_EQ(Counted(0, "error"), "0 errors");
    EXPECT_EQ(Counted(1'234, "error"), "1,234 errors");
}

TEST(Quantity, OfTimeIsRoundedDownToALargeUnit) {
    EXPECT_EQ(Duration(119'999), "119 s");
    EXPECT_EQ(Duration(120'000), "2 min");
    EXPECT_EQ(Duration(7'200'000), "2 h");
    EXPECT_EQ(Duration(172'800'000), "2 days");
}

} // namespace
