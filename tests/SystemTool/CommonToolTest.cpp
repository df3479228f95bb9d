#include "SystemTool/CommonTool.h"

#include <cstdio>
#include <cstdlib>

#include <gtest/gtest.h>
#include <pwd.h>
#include <sys/utsname.h>
#include <unistd.h>

using SystemTool::CommonTool::GetOSVersionString;
using SystemTool::CommonTool::GetUserDataDir;

namespace {

/// The system's name in os-release, as a shell reads it.
std::string PrettyName() {
    FILE* const shell = ::popen(". /etc/os-release && printf %s \"$PRETTY_NAME\"", "r");
    std::string name(200, '\0');
    name.resize(std::fread(name.data(), 1, name.size(), shell));
    ::pclose(shell);
    return name;
}

} // namespace

TEST(UserDataDir, IsTheDataHomeOfTheDesktopWhenThatIsAbsolute) {
    ::setenv("XDG_DATA_HOME", "/somewhere/data", 1);
    ::setenv("HOME", "/home/u", 1);
    EXPECT_EQ(GetUserDataDir(), "/somewhere/data");
}

TEST(UserDataDir, HasNoTrailingSeparator) {
    ::setenv("XDG_DATA_HOME", "/somewhere/data//", 1);
    EXPECT_EQ(GetUserDataDir(), "/somewhere/data");
    ::unsetenv("XDG_DATA_HOME");
    ::setenv("HOME", "/home/u/", 1);
    EXPECT_EQ(GetUserDataDir(), "/home/u/.local/share");
    ::setenv("HOME", "/", 1);
    EXPECT_EQ(GetUserDataDir(), "/.local/share");
}

TEST(UserDataDir, IsBelowTheHomeDirectoryOtherwise) {
    ::setenv("HOME", "/home/u", 1);
    for (const char* ignored : {"", "relative/path"}) {
        ::setenv("XDG_DATA_HOME", ignored, 1);
        EXPECT_EQ(GetUserDataDir(), "/home/u/.local/share") << ignored;
    }
}

TEST(UserDataDir, IsBelowThePasswordEntrysHomeWithoutAnEnvironment) {
    ::unsetenv("XDG_DATA_HOME");
    ::unsetenv("HOME");
    EXPECT_EQ(GetUserDataDir(), std::string(::getpwuid(::getuid())->pw_dir) + "/.local/share");
}

TEST(OSVersionString, EndsWithTheKernelsRelease) {
    utsname kernel{};
    ASSERT_EQ(::uname(&kernel), 0);
    const std::string version = GetOSVersionString();
    EXPECT_TRUE(version.ends_with(std::string(" ") + kernel.release)) << version;
    EXPECT_TRUE(version.starts_with(PrettyName())) << version;
    EXPECT_EQ(version.find('"'), std::string::npos) << "the quotes of os-release are not part of the name";
}
