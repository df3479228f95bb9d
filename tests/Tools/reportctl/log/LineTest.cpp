#include "Tools/reportctl/log/Line.h"

#include <gtest/gtest.h>

#include "SystemTool/Text/EscapedText.h"
#include "Tools/reportctl/terminal/WrittenTime.h"

namespace {

using reportctl::log::ReadLine;
using reportctl::log::Unescaped;

TEST(LogLine, IsTakenApart) {
    const auto line = ReadLine(
        "2026-11-20 10:15:30.123 WARN  [4711:4715] [App/ReportServer:42 Recv #tag] two\\nlines [x] y");
    ASSERT_TRUE(line);
    EXPECT_EQ(line->stamp, "2026-11-20 10:15:30.123");
    EXPECT_EQ(line->level, 3);
    EXPECT_EQ(line->process, "4711");
    EXPECT_EQ(line->site, "App/ReportServer");
    EXPECT_EQ(line->function, "Recv");
    EXPECT_EQ(line->message, "two\nlines [x] y");
    EXPECT_EQ(reportctl::terminal::LocalTime(line->time), "2026-11-20 10:15:30.123");
}

TEST(LogLine, KnowsALevelThatIsANumber) {
    const auto line = ReadLine("2026-11-20 10:15:30.123 17    [1:2] [A/B:1 f] x");
    ASSERT_TRUE(line);
    EXPECT_EQ(line->level, 17);
}

TEST(LogLine, IsNoneWhenItWasTorn) {
    for (const auto* text : {"", "2026-11-20 10:15:30.123", "2026-11-20 10:15:30.123 INFO  [1:2] [App/Rep",
                             "2026-11-20T10:15:30.123 INFO  [1:2] [A/B:1 f] x", "half a line"})
        EXPECT_FALSE(ReadLine(text)) << text;
}

TEST(LogLine, GivesEveryByteBackThatTheLogEscaped) {
    std::string bytes;
    for (int byte = 0; byte < 256; ++byte)
        bytes += static_cast<char>(byte);
    bytes += "\\x41 \\n \xe2\x80\xae \xf0\x9f\x98\x80 \\";
    SystemTool::Text::LineBuffer line;
    SystemTool::Text::AppendEscaped(line, bytes);
    EXPECT_EQ(Unescaped(SystemTool::Text::TextOf(line)), bytes);
}

TEST(LogLine, KeepsWhatIsNoEscape) {
    EXPECT_EQ(Unescaped("\\q \\x4 \\xzz \\"), "\\q \\x4 \\xzz \\");
}

} // namespace
