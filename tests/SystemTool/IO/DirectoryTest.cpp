#include "SystemTool/IO/Directory.h"

#include <filesystem>

#include <gtest/gtest.h>

namespace Directory = SystemTool::IO::Directory;

TEST(ExcutableDirectory, EndsInASeparatorAndHoldsTheExecutable) {
    const std::string directory = Directory::GetExcutableDirectory();
    EXPECT_TRUE(directory.ends_with('/'));
    EXPECT_EQ(directory + "systemtool_tests", std::filesystem::read_symlink("/proc/self/exe").string());
}

TEST(TransformAsUnixPath, TurnsBackslashesIntoSlashes) {
    std::string out;
    EXPECT_TRUE(Directory::TransformAsUnixPath(R"(C:\a\b/c.dll)", out));
    EXPECT_EQ(out, "C:/a/b/c.dll");
}

TEST(TransformAsUnixPath, WorksInPlace) {
    std::string path = R"(a\b)";
    EXPECT_TRUE(Directory::TransformAsUnixPath(path, path));
    EXPECT_EQ(path, "a/b");
}

TEST(TransformAsUnixPath, RefusesWhatCanBeNoPath) {
    std::string out = "as it was";
    EXPECT_FALSE(Directory::TransformAsUnixPath("", out));
    EXPECT_FALSE(Directory::TransformAsUnixPath(std::string("a\0b", 3), out));
    EXPECT_EQ(out, "as it was");
}
