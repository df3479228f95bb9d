#include "SystemTool/Text/Utf8.h"

#include <gtest/gtest.h>

using namespace SystemTool::Text;

TEST(Utf8, KnowsTheFirstAndTheLastCharacterOfEachLength) {
    for (const std::string text : {"\x01", "\x7f", "\u0080", "\u07ff", "\u0800", "\ud7ff", "\ue000", "\uffff",
                                   "\U00010000", "\U0010ffff"})
        EXPECT_EQ(CharacterLength(text + "x"), text.size()) << text;
}

TEST(Utf8, KnowsWhatNoCharacterBeginsWith) {
    for (const std::string text : {"\x80", "\xbf", "\xc0\x80", "\xc1\xbf", "\xf5\x80\x80\x80", "\xff"})
        EXPECT_EQ(CharacterLength(text), 0U);
}

TEST(Utf8, RefusesLongForms) {
    EXPECT_EQ(CharacterLength("\xe0\x9f\xbf"), 0U);
    EXPECT_EQ(CharacterLength("\xf0\x8f\xbf\xbf"), 0U);
}

TEST(Utf8, RefusesSurrogatesAndValuesBeyondUnicode) {
    EXPECT_EQ(CharacterLength("\xed\xa0\x80"), 0U);
    EXPECT_EQ(CharacterLength("\xf4\x90\x80\x80"), 0U);
}

TEST(Utf8, RefusesACharacterThatIsCutOff) {
    EXPECT_EQ(CharacterLength("\xc3"), 0U);
    EXPECT_EQ(CharacterLength("\xe2\x82"), 0U);
    EXPECT_EQ(CharacterLength("\xe2\x82y"), 0U);
    EXPECT_EQ(CharacterLength("\xf0\x9f\x98"), 0U);
}

TEST(ValidUtf8, LeavesAValidTextAsItIs) {
    const std::string text("a\0\u00e9\u62a5\U0001F600", 11);
    EXPECT_EQ(ValidUtf8(text), text);
}

TEST(ValidUtf8, ReplacesEachBadByteAndLosesNoGoodOne) {
    EXPECT_EQ(ValidUtf8("\xe2y"), "\ufffdy");
    EXPECT_EQ(ValidUtf8("x\xe2\x82y"), "x\ufffd\ufffdy");
    EXPECT_EQ(ValidUtf8("\xe2\x82"), "\ufffd\ufffd");
    EXPECT_EQ(ValidUtf8("12345678\xff"), "12345678\ufffd");
}

TEST(IsAscii, LooksAtEveryByte) {
    for (std::size_t place = 0; place < 20; ++place) {
        std::string text(20, 'a');
        EXPECT_TRUE(IsAscii(text));
        text[place] = '\x80';
        EXPECT_FALSE(IsAscii(text)) << place;
    }
}

TEST(CutUtf8, NeverCutsWithinACharacter) {
    EXPECT_EQ(CutUtf8("abc", 3), "abc");
    EXPECT_EQ(CutUtf8("abcd", 3), "abc");
    EXPECT_EQ(CutUtf8("ab\u62a5", 4), "ab");
    EXPECT_EQ(CutUtf8("ab\u62a5", 3), "ab");
    EXPECT_EQ(CutUtf8("ab\u62a5", 2), "ab");
    EXPECT_EQ(CutUtf8("a\U0001F600", 4), "a");
    EXPECT_EQ(CutUtf8("\U0001F600", 2), "");
}

TEST(CutUtf8, CutsWhatIsNoUtf8AnywhereAtTheLimit) {
    EXPECT_EQ(CutUtf8("\x80\x80\x80\x80\x80\x80\x80\x80", 6).size(), 6U);
}
