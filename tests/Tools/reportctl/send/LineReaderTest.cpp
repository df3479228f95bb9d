#include "Tools/reportctl/send/LineReader.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "SystemTool/IO/Descriptor.h"
#include "tests/support/OtherThread.h"

using reportctl::send::LineReader;
using ::testing::ElementsAre;

namespace {

/// The test writes to a pipe, and the reader reads from it.
class TheLineReader : public ::testing::Test {
protected:
    TheLineReader() {
        int ends[2];
        if (::pipe(ends) != 0)
            throw std::runtime_error("no pipe");
        m_readEnd = SystemTool::IO::Descriptor(ends[0]);
        m_writeEnd = SystemTool::IO::Descriptor(ends[1]);
    }

    void Write(const std::string& text) const {
        ASSERT_EQ(::write(m_writeEnd.Number(), text.data(), text.size()), static_cast<ssize_t>(text.size()));
    }

    std::vector<std::string> Lines(const std::string& text) {
        Write(text);
        m_writeEnd.Close();
        LineReader reader(m_readEnd.Number());
        std::vector<std::string> lines;
        while (reader.Next())
            lines.push_back(reader.Text());
        EXPECT_FALSE(reader.HasFailed());
        return lines;
    }

    SystemTool::IO::Descriptor m_readEnd;
    SystemTool::IO::Descriptor m_writeEnd;
};

} // namespace

TEST_F(TheLineReader, TakesTheLastLineWithAndWithoutItsLineFeed) {
    EXPECT_THAT(Lines("one\n\ntwo"), ElementsAre("one", "", "two"));
}

TEST_F(TheLineReader, TakesALineFeedAtTheEndForAnEnd) {
    EXPECT_THAT(Lines("one\n"), ElementsAre("one"));
}

TEST_F(TheLineReader, KeepsZeroBytesAndCarriageReturns) {
    EXPECT_THAT(Lines(std::string("a\0b\r\n", 5)), ElementsAre(std::string("a\0b\r", 4)));
}

TEST_F(TheLineReader, GivesALineBeforeTheNextOneIsWritten) {
    LineReader reader(m_readEnd.Number());
    Write("one\ntw");
    EXPECT_TRUE(reader.Next());
    EXPECT_EQ(reader.Text(), "one");
    Write("o\n");
    EXPECT_TRUE(reader.Next());
    EXPECT_EQ(reader.Text(), "two");
}

TEST_F(TheLineReader, KeepsTheBeginningOfALineOfAHundredMegabytes) {
    constexpr std::size_t CHUNKS = 1600;
    const std::string chunk(64 * 1024, 'x');
    OtherThread writer([&] {
        for (std::size_t i = 0; i < CHUNKS; ++i)
            Write(chunk);
        Write("\nafter\n");
        m_writeEnd.Close();
    });
    LineReader reader(m_readEnd.Number());
    ASSERT_TRUE(reader.Next());
    EXPECT_FALSE(reader.IsWhole());
    EXPECT_EQ(reader.Bytes(), CHUNKS * chunk.size());
    EXPECT_EQ(reader.Text(), chunk);
    EXPECT_LE(reader.Text().capacity(), 2 * LineReader::KEPT_BYTES);
    ASSERT_TRUE(reader.Next());
    EXPECT_TRUE(reader.IsWhole());
    EXPECT_EQ(reader.Text(), "after");
    EXPECT_FALSE(reader.Next());
}

TEST_F(TheLineReader, TellsThatItCouldNotRead) {
    const SystemTool::IO::Descriptor directory(::open("/", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    LineReader reader(directory.Number());
    EXPECT_FALSE(reader.Next());
    EXPECT_TRUE(reader.HasFailed());
}
