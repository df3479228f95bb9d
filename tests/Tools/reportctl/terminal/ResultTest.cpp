#include "Tools/reportctl/terminal/Result.h"

#include <filesystem>
#include <fstream>
#include <system_error>

#include <gtest/gtest.h>

#include "tests/support/FileContent.h"
#include "tests/support/ModeOf.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using reportctl::terminal::Result;

class ResultFile : public testing::Test {
protected:
    std::string Path() const { return m_directory.Path() + "/file"; }

    std::ptrdiff_t Files() const {
        return std::distance(std::filesystem::directory_iterator(m_directory.Path()), {});
    }

private:
    TemporaryDirectory m_directory;
};

TEST_F(ResultFile, IsThereOnceItIsFinished) {
    Result output(Path());
    output.Write("one ");
    output.Write(std::string(1 << 20, 'x'));
    EXPECT_FALSE(std::filesystem::exists(Path()));
    output.Finish();
    EXPECT_EQ(ContentOf(Path()), "one " + std::string(1 << 20, 'x'));
    EXPECT_EQ(Files(), 1);
}

TEST_F(ResultFile, LeavesTheOldOneWhenItIsNotFinished) {
    std::ofstream(Path()) << "old";
    {
        Result output(Path());
        output.Write(std::string(1 << 20, 'x'));
    }
    EXPECT_EQ(ContentOf(Path()), "old");
    EXPECT_EQ(Files(), 1);
}

TEST_F(ResultFile, ReplacesALinkAndNotWhatItPointsTo) {
    std::ofstream(Path() + "-target") << "target";
    std::filesystem::create_symlink(Path() + "-target", Path());
    Result output(Path());
    output.Write("new");
    output.Finish();
    EXPECT_EQ(ContentOf(Path() + "-target"), "target");
    EXPECT_EQ(ContentOf(Path()), "new");
}

TEST_F(ResultFile, SaysWhichFileCannotBeWritten) {
    try {
        const Result output(Path() + "/no/such");
        FAIL() << "opened";
    } catch (const std::system_error& error) {
        EXPECT_EQ(std::string(error.what()),
                  "cannot write " + Path() + "/no/such: No such file or directory");
    }
}

} // namespace
