#include "SystemTool/IO/MakeDirectories.h"

#include <cerrno>
#include <filesystem>
#include <fstream>

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "tests/support/ModeOf.h"
#include "tests/support/TemporaryDirectory.h"

using SystemTool::IO::MakeDirectories;

namespace {

class TheMakeDirectories : public testing::Test {
protected:
    ~TheMakeDirectories() override { ::umask(m_umask); }

    const mode_t m_umask = ::umask(022);
    const TemporaryDirectory m_directory;
    const std::string m_path = m_directory.Path() + "/a/b/c";
};

TEST_F(TheMakeDirectories, MakesThemPrivateWhateverTheUmask) {
    for (const mode_t mask : {0, 022, 0277, 0777}) {
        const auto path = m_directory.Path() + "/" + std::to_string(mask);
        ::umask(mask);
        EXPECT_FALSE(MakeDirectories(path + "/b/c"));
        ::umask(022);
        for (const auto* level : {"", "/b", "/b/c"})
            EXPECT_EQ(ModeOf(path + level), 0700U) << mask << " " << level;
    }
}

TEST_F(TheMakeDirectories, GivesTheLastOneAndItsParentsTheModesThatAreAskedFor) {
    EXPECT_FALSE(MakeDirectories(m_path, 01777, 0755));
    EXPECT_EQ(ModeOf(m_path), 01777U);
    EXPECT_EQ(ModeOf(m_directory.Path() + "/a"), 0755U);
    EXPECT_EQ(ModeOf(m_directory.Path() + "/a/b"), 0755U);
}

TEST_F(TheMakeDirectories, LeavesTheModeOfADirectoryThatIsThere) {
    std::filesystem::create_directories(m_path);
    ::chmod(m_path.c_str(), 0755);
    EXPECT_FALSE(MakeDirectories(m_path));
    EXPECT_EQ(ModeOf(m_path), 0755U);
}

TEST_F(TheMakeDirectories, TakesALinkToADirectoryForADirectory) {
    std::filesystem::create_directory(m_directory.Path() + "/elsewhere");
    std::filesystem::create_directory_symlink("elsewhere", m_directory.Path() + "/a");
    EXPECT_FALSE(MakeDirectories(m_path));
    EXPECT_EQ(ModeOf(m_directory.Path() + "/elsewhere/b/c"), 0700U);
}

TEST_F(TheMakeDirectories, NamesTheParentThatIsAFile) {
    std::ofstream(m_directory.Path() + "/a");
    const auto failure = MakeDirectories(m_path);
    EXPECT_EQ(failure.error, ENOTDIR);
    EXPECT_EQ(failure.path, m_directory.Path() + "/a");
}

TEST_F(TheMakeDirectories, SaysWhyThereIsNone) {
    std::filesystem::create_symlink("nowhere", m_directory.Path() + "/a");
    EXPECT_EQ(MakeDirectories(m_path).error, EEXIST);
}

} // namespace
