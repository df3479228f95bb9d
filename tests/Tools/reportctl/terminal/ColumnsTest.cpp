#include "Tools/reportctl/terminal/Columns.h"

#include <gtest/gtest.h>

namespace {

using reportctl::terminal::Broken;

TEST(LineForTheTerminal, IsBrokenAtBlanksAndIndented) {
    EXPECT_EQ(Broken("name  the quick brown fox jumps over it", 30, 6), "name  the quick brown fox\n"
                                                                        "      jumps over it");
}

TEST(LineForTheTerminal, MayBeAsLongAsTheTerminalIsWide) {
    EXPECT_EQ(Broken("12345678901234567890 234567890", 30), "12345678901234567890 234567890");
    EXPECT_EQ(Broken("12345678901234567890 2345678901", 30), "12345678901234567890\n2345678901");
}

TEST(LineForTheTerminal, KeepsAWordThatIsLongerThanTheTerminalIsWide) {
    EXPECT_EQ(Broken("see 123456789012345678901234567890 there", 25),
              "see\n123456789012345678901234567890\nthere");
}

TEST(LineForTheTerminal, CountsCharactersNotBytes) {
    EXPECT_EQ(Broken("ääääääääää öööööööööö", 21), "ääääääääää öööööööööö");
}

TEST(LineForTheTerminal, IsNotBrokenWithoutATerminalOrOnANarrowOne) {
    const std::string text = "the quick brown fox jumps over the lazy dog";
    EXPECT_EQ(Broken(text, 0), text);
    EXPECT_EQ(Broken(text, 25, 11), text);
}

} // namespace
