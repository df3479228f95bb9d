#include "SystemTool/DllLoader.h"

#include <fstream>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "SystemTool/IO/Directory.h"
#include "tests/support/TemporaryDirectory.h"

using SystemTool::DllLoader;
using ::testing::HasSubstr;

// This test is here and not in tests/SystemTool, because here is a library that it can load.

namespace {

std::string Library() {
    return SystemTool::IO::Directory::GetExcutableDirectory() + "libModule.dylib";
}

} // namespace

TEST(DllLoader, BeginsWithoutALibrary) {
    const DllLoader loader;
    EXPECT_FALSE(loader.IsLoad());
    EXPECT_FALSE(loader.IsHasFunc("CreateModule"));
    EXPECT_EQ(loader.GetLastError(), "");
}

TEST(DllLoader, OpensTheLibraryAtThePathAsGiven) {
    DllLoader loader;
    EXPECT_TRUE(loader.Load(Library()));
    EXPECT_TRUE(loader.IsLoad());
    EXPECT_TRUE(loader.IsHasFunc("CreateModule"));
    EXPECT_FALSE(loader.IsHasFunc("NoSuchFunction"));
    EXPECT_EQ(loader.GetLastError(), "");
    loader.Unload();
    EXPECT_FALSE(loader.IsLoad());
}

TEST(DllLoader, AddsNeitherPrefixNorSuffix) {
    DllLoader loader;
    EXPECT_FALSE(loader.Load(SystemTool::IO::Directory::GetExcutableDirectory() + "Module"));
}

TEST(DllLoader, SaysWhyALibraryCannotBeOpened) {
    const TemporaryDirectory directory;
    const std::string path = directory.Path() + "/text.dylib";
    std::ofstream(path) << "text";
    DllLoader loader;
    EXPECT_FALSE(loader.Load(path));
    EXPECT_FALSE(loader.IsLoad());
    EXPECT_THAT(loader.GetLastError(), HasSubstr("Cannot open the library " + path));
    EXPECT_THAT(loader.GetLastError(), HasSubstr("file too short"));
}

TEST(DllLoader, ClosesTheFormerLibraryFirst) {
    DllLoader loader;
    ASSERT_TRUE(loader.Load(Library()));
    EXPECT_FALSE(loader.Load("/no/such/library.dylib"));
    EXPECT_FALSE(loader.IsLoad());
}

TEST(DllLoader, ThrowsForAMissingSymbol) {
    DllLoader loader;
    ASSERT_TRUE(loader.Load(Library()));
    EXPECT_THROW(loader.get<void()>("NoSuchFunction"), boost::system::system_error);
}
