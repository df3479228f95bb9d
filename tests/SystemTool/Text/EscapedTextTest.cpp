#include "SystemTool/Text/EscapedText.h"

#include <random>

#include <gtest/gtest.h>

namespace {

std::string Escaped(std::string_view text) {
    SystemTool::Text::LineBuffer line;
    SystemTool::Text::AppendEscaped(line, text);
    return std::string(SystemTool::Text::TextOf(line));
}

std::string Unescaped(const std::string& text) {
    std::string bytes;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '\\') {
            bytes += text[i];
            continue;
        }
        switch (text[++i]) {
        case 'n':
            bytes += '\n';
            break;
        case 'r':
            bytes += '\r';
            break;
        case 't':
            bytes += '\t';
            break;
        case 'x':
            bytes += static_cast<char>(std::stoi(text.substr(i + 1, 2), nullptr, 16));
            i += 2;
            break;
        default:
            bytes += text[i];
        }
    }
    return bytes;
}

} // namespace

TEST(EscapedText, LeavesReadableTextAlone) {
    const std::string text = "{\"a\": \"Gr\u00fc\u00dfe \u62a5\u544a \U0001F600 \u0628 %s \u00a0~\"}";
    EXPECT_EQ(Escaped(text), text);
    EXPECT_EQ(Escaped(""), "");
}

TEST(EscapedText, KeepsATextOnItsLine) {
    EXPECT_EQ(Escaped("one\ntwo\r\n\tthree"), "one\\ntwo\\r\\n\\tthree");
    EXPECT_EQ(Escaped("\u2028 \u2029"), "\\xe2\\x80\\xa8 \\xe2\\x80\\xa9");
}

TEST(EscapedText, KeepsATextFromDrivingATerminal) {
    EXPECT_EQ(Escaped("\x1b[2J \a \x7f"), "\\x1b[2J \\x07 \\x7f");
    EXPECT_EQ(Escaped("\xc2\x9b[2J \xc2\x80"), "\\xc2\\x9b[2J \\xc2\\x80");
    EXPECT_EQ(Escaped("\u202e \u2066"), "\\xe2\\x80\\xae \\xe2\\x81\\xa6");
}

TEST(EscapedText, ShowsWhatHides) {
    EXPECT_EQ(Escaped("\u200a\u200b\u200f\u2010"), "\u200a\\xe2\\x80\\x8b\\xe2\\x80\\x8f\u2010");
    EXPECT_EQ(Escaped("\u061b\u061c\u061d"), "\u061b\\xd8\\x9c\u061d");
    EXPECT_EQ(Escaped("\u205f\u2060\u2064\u2065"), "\u205f\\xe2\\x81\\xa0\\xe2\\x81\\xa4\u2065");
    EXPECT_EQ(Escaped("a\ufeffb\ufefe"), "a\\xef\\xbb\\xbfb\ufefe");
    EXPECT_EQ(Escaped("\U000E0000\U000E007F\U000E0080"),
              "\\xf3\\xa0\\x80\\x80\\xf3\\xa0\\x81\\xbf\U000E0080");
    EXPECT_EQ(Escaped("\U000DFFFF"), "\U000DFFFF");
}

TEST(EscapedText, EscapesAZeroByte) {
    EXPECT_EQ(Escaped(std::string_view("a\0b", 3)), "a\\x00b");
}

TEST(EscapedText, DoublesABackslashSoThatAnEscapeCannotBeFaked) {
    EXPECT_EQ(Escaped("a\\nb"), "a\\\\nb");
}

TEST(EscapedText, EscapesBytesThatAreNoUtf8) {
    EXPECT_EQ(Escaped("\x80"), "\\x80");                            // a continuation alone
    EXPECT_EQ(Escaped("\xc3"), "\\xc3");                            // cut off
    EXPECT_EQ(Escaped("\xe6\x8a."), "\\xe6\\x8a.");                 // cut off within the text
    EXPECT_EQ(Escaped("\xc0\x8a"), "\\xc0\\x8a");                   // a newline in two bytes
    EXPECT_EQ(Escaped("\xe0\x80\x8a"), "\\xe0\\x80\\x8a");          // a newline in three bytes
    EXPECT_EQ(Escaped("\xed\xa0\x80"), "\\xed\\xa0\\x80");          // a surrogate
    EXPECT_EQ(Escaped("\xf4\x90\x80\x80"), "\\xf4\\x90\\x80\\x80"); // beyond Unicode
    EXPECT_EQ(Escaped("\xf0\x8f\xbf\xbf\xff"), "\\xf0\\x8f\\xbf\\xbf\\xff");
}

TEST(EscapedText, FindsTheOddByteAtAnyPlace) {
    for (std::size_t place = 0; place < 100; ++place) {
        std::string text(100, 'a');
        text[place] = '\n';
        EXPECT_EQ(Escaped(text), std::string(place, 'a') + "\\n" + std::string(99 - place, 'a'));
    }
}

TEST(EscapedText, CanBeTurnedBackIntoTheSameBytesAndEscapingItAgainChangesOnlyBackslashes) {
    std::mt19937 random(20261120);
    for (int round = 0; round < 3000; ++round) {
        std::string bytes(random() % 120, '\0');
        // Any byte, but mostly bytes that begin or continue a character.
        for (char& byte : bytes)
            byte = static_cast<char>(random() % 3 == 0 ? random() % 256 : 0x80 + random() % 128);
        const std::string escaped = Escaped(bytes);
        EXPECT_EQ(Unescaped(escaped), bytes);
        std::string again = Escaped(escaped); // this would escape any text that is not valid, harmless UTF-8
        for (auto at = again.find("\\\\"); at != std::string::npos; at = again.find("\\\\", at + 1))
            again.erase(at, 1);
        EXPECT_EQ(again, escaped);
    }
}
