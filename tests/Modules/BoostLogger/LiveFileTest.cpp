#include "Modules/BoostLogger/LiveFile.h"

#include <cerrno>

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "tests/Modules/BoostLogger/LogFiles.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/OtherUser.h"
#include "tests/support/TemporaryDirectory.h"

using BoostLogger::LiveFile;
using BoostLogger::MakeDirectory;

namespace {

class TheLiveFile : public testing::Test {
protected:
    TemporaryDirectory m_directory;
    const std::string m_path = m_directory.Path() + "/Report.log";
    LiveFile m_file;
};

} // namespace

TEST_F(TheLiveFile, AppendsToWhatIsThere) {
    WriteFile(m_path, "old\n");
    ASSERT_FALSE(m_file.Open(m_path));
    EXPECT_EQ(m_file.SizeBytes(), 4);
    ASSERT_FALSE(m_file.Append("new\n"));
    EXPECT_EQ(m_file.SizeBytes(), 8);
    EXPECT_EQ(ContentOf(m_path), "old\nnew\n");
}

TEST_F(TheLiveFile, SeesWithinSixteenLinesHowMuchAnotherWriterAppended) {
    LiveFile other;
    ASSERT_FALSE(m_file.Open(m_path));
    ASSERT_FALSE(other.Open(m_path));
    ASSERT_FALSE(other.Append("0123456789\n"));
    for (int i = 0; i < 16; ++i)
        ASSERT_FALSE(m_file.Append("x\n"));
    EXPECT_EQ(m_file.SizeBytes(), 11 + 16 * 2);
}

TEST_F(TheLiveFile, SeesHowMuchAnotherWriterAppendedWhenItLooksAtThePath) {
    LiveFile other;
    ASSERT_FALSE(m_file.Open(m_path));
    ASSERT_FALSE(other.Open(m_path));
    ASSERT_FALSE(other.Append("0123456789\n"));
    EXPECT_FALSE(m_file.IsGoneFrom(m_path));
    EXPECT_EQ(m_file.SizeBytes(), 11);
}

TEST_F(TheLiveFile, StartsANewLineAfterAHalfLineThatItFinds) {
    WriteFile(m_path, "half of a li");
    ASSERT_FALSE(m_file.Open(m_path));
    ASSERT_FALSE(m_file.Append("whole\n"));
    ASSERT_FALSE(m_file.Append("next\n"));
    EXPECT_EQ(ContentOf(m_path), "half of a li\nwhole\nnext\n");
}

TEST_F(TheLiveFile, NarrowsTheModeOfAWiderFile) {
    WriteFile(m_path, "");
    ASSERT_EQ(chmod(m_path.c_str(), 0666), 0);
    ASSERT_FALSE(m_file.Open(m_path));
    EXPECT_EQ(ModeOf(m_path), 0600U);
}

TEST_F(TheLiveFile, HasItsModesWhateverTheUmask) {
    for (const mode_t mask : {0000, 0777}) {
        const std::string directory = m_directory.Path() + "/" + std::to_string(mask);
        ChildProcess child([&] {
            umask(mask);
            return !MakeDirectory(directory + "/a/b") && !m_file.Open(directory + "/a/b/Report.log");
        });
        EXPECT_EQ(child.Wait(), 0);
        EXPECT_EQ(ModeOf(directory), 0700U);
        EXPECT_EQ(ModeOf(directory + "/a"), 0700U);
        EXPECT_EQ(ModeOf(directory + "/a/b"), 0700U);
        EXPECT_EQ(ModeOf(directory + "/a/b/Report.log"), 0600U);
    }
}

TEST_F(TheLiveFile, LeavesTheModeOfADirectoryThatIsThere) {
    const std::string directory = m_directory.Path() + "/wide";
    ASSERT_EQ(mkdir(directory.c_str(), 0700), 0);
    ASSERT_EQ(chmod(directory.c_str(), 0755), 0);
    EXPECT_FALSE(MakeDirectory(directory));
    EXPECT_EQ(ModeOf(directory), 0755U);
}

TEST_F(TheLiveFile, SaysWhyADirectoryCouldNotBeMade) {
    const std::string parent = m_directory.Path();
    ChildProcess child([&] {
        return OtherUser::BecomeOwnerOf(parent) && chmod(parent.c_str(), 0555) == 0 &&
               MakeDirectory(parent + "/log/metrik").Text() == "cannot make the directory: Permission denied";
    });
    EXPECT_EQ(child.Wait(), 0);
    chmod(parent.c_str(), 0700); // so that the fixture can remove the directory
}

TEST_F(TheLiveFile, IsNoLinkAndNoPipeAndNoDirectory) {
    ASSERT_EQ(symlink("elsewhere", m_path.c_str()), 0);
    EXPECT_EQ(m_file.Open(m_path).error, ELOOP);
    EXPECT_FALSE(std::filesystem::exists(m_directory.Path() + "/elsewhere"));

    const std::string pipe = m_directory.Path() + "/pipe";
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    EXPECT_EQ(m_file.Open(pipe).Text(), "cannot use what is no regular file: Invalid argument");

    EXPECT_EQ(m_file.Open(m_directory.Path()).error, EISDIR);
    EXPECT_FALSE(m_file.IsOpen());
}

TEST_F(TheLiveFile, KnowsWhenThePathIsAnotherFile) {
    ASSERT_FALSE(m_file.Open(m_path));
    EXPECT_FALSE(m_file.IsGoneFrom(m_path));
    std::filesystem::rename(m_path, m_path + ".away");
    EXPECT_TRUE(m_file.IsGoneFrom(m_path));
    WriteFile(m_path, "");
    EXPECT_TRUE(m_file.IsGoneFrom(m_path));
    EXPECT_FALSE(m_file.IsGoneFrom(m_path + ".away"));
}

TEST_F(TheLiveFile, IsLockedAgainstAnotherUntilItIsClosed) {
    LiveFile other;
    ASSERT_FALSE(m_file.Open(m_path));
    ASSERT_FALSE(other.Open(m_path));
    ASSERT_FALSE(m_file.Lock());
    EXPECT_EQ(other.Lock().error, EWOULDBLOCK);
    m_file.Close();
    EXPECT_FALSE(other.Lock());
}
