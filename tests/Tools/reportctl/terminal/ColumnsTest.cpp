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

TEST(TextForTheTerminal, IsCutWhereItWouldScroll) {
    using reportctl::terminal::FirstRows;
    EXPECT_EQ(FirstRows("1\n2\n3\n", 4, 80), "1\n2\n3\n");
    EXPECT_EQ(FirstRows("1\n2\n3\n", 3, 80), "1\n2\n");
    EXPECT_EQ(FirstRows("1\n" + std::string(81, 'x') + "\n3\n", 4, 80), "1\n" + std::string(81, 'x') + "\n");
    EXPECT_EQ(FirstRows("1\n2\n3\n", 0, 0), "1\n2\n3\n") << "there is no terminal";
}

} // namespace
