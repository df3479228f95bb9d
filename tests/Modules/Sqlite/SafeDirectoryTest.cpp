#include "Modules/Sqlite/SafeDirectory.h"

#include <filesystem>
#include <fstream>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "Modules/Sqlite/Trust.h"
#include "tests/support/ModeOf.h"
#include "tests/support/OtherUser.h"
#include "tests/support/TemporaryDirectory.h"

using namespace Sqlite;
using ::testing::HasSubstr;

namespace fs = std::filesystem;

namespace {

/// The data directory and the place outside it are both below /tmp, which every user may write.
class TheSafeDirectory : public ::testing::Test {
protected:
    std::string Open(const std::string& path) const { return SafeDirectory::Open(path, Home()).Path(); }

    /// Why the path is refused, both when it is announced and when it is opened; empty when it is accepted.
    std::string Refusal(const std::string& path) const {
        std::string announced;
        try {
            SafeDirectory::Resolve(path, Home());
        } catch (const UnsafePath& refusal) {
            announced = refusal.what();
        }
        try {
            Open(path);
        } catch (const UnsafePath& refusal) {
            EXPECT_EQ(announced, refusal.what());
            return refusal.what();
        }
        return announced.empty() ? "" : "refused when announced, and not when opened: " + announced;
    }

    std::string Home() const { return m_home.Path(); }
    std::string Outside() const { return m_outside.Path(); }

    /// Makes a directory of this user near the root: other users cannot write to any part of its path. Empty
    /// when that is not allowed.
    std::string PrivateRoot() const {
        const auto path = "/run/ssr-test-" + std::to_string(::getpid());
        return ::mkdir(path.c_str(), 0755) == 0 ? path : "";
    }

    TemporaryDirectory m_home;
    TemporaryDirectory m_outside;
};

} // namespace

TEST_F(TheSafeDirectory, MakesWhatIsMissingBelowTheDataDirectoryForItsUserAlone) {
    for (const mode_t mask : {0, 0277, 0777}) {
        const auto umask = ::umask(mask);
        EXPECT_EQ(Open(Home() + "/a/b"), Home() + "/a/b");
        ::umask(umask);
        EXPECT_EQ(ModeOf(Home() + "/a"), 0700U) << mask;
        EXPECT_EQ(ModeOf(Home() + "/a/b"), 0700U) << mask;
        fs::remove_all(Home() + "/a");
    }
}

TEST_F(TheSafeDirectory, MakesTheDataDirectoryToo) {
    EXPECT_EQ(SafeDirectory::Open(Home() + "/x/share/hublink", Home() + "/x/share").Path(),
              Home() + "/x/share/hublink");
    EXPECT_EQ(ModeOf(Home() + "/x/share"), 0700U);
}

TEST_F(TheSafeDirectory, ResolvesOneNameAndMakesNothing) {
    fs::create_directory_symlink(Home(), Home() + "/link");
    for (const std::string same : {"/db", "/db/", "/./db", "/x/../db", "//db", "/link/db", "/link/link/db"})
        EXPECT_EQ(SafeDirectory::Resolve(Home() + same, Home()), Home() + "/db") << same;
    EXPECT_FALSE(fs::exists(Home() + "/db"));
    EXPECT_EQ(SafeDirectory::Resolve(Home() + "/none/db", Home() + "/none"), Home() + "/none/db");
}

TEST_F(TheSafeDirectory, RefusesADirectoryBelowOneThatOthersMayWriteThoughItIsSticky) {
    EXPECT_EQ(Refusal(Outside()), "/tmp may be written by other users");
    EXPECT_EQ(Refusal(Outside() + "/new"), "/tmp may be written by other users");
    EXPECT_EQ(Refusal(Home() + "/../x"), "/tmp may be written by other users");
    EXPECT_TRUE(fs::is_empty(Outside()));
}

TEST_F(TheSafeDirectory, TakesADirectoryOutsideWhenNoOtherUserCanChangeItsPath) {
    const auto path = PrivateRoot();
    if (path.empty())
        GTEST_SKIP() << "only root can make a directory whose path is its own";
    EXPECT_EQ(Refusal(path), "");
    EXPECT_EQ(Refusal(path + "/new"),
              path + "/new does not exist, and is only made below the user's data directory");
    fs::create_directory(path + "/wide");
    for (const auto mode : {0770U, 0707U, 01777U}) {
        fs::permissions(path + "/wide", fs::perms{mode});
        EXPECT_EQ(Refusal(path + "/wide"), path + "/wide may be written by other users") << mode;
    }
    fs::remove_all(path);
}

TEST_F(TheSafeDirectory, RefusesWhatIsNoAbsolutePathAndWhatIsNoDirectory) {
    for (const auto& path : {std::string(), std::string("relative"), std::string("../up"), std::string("~/x"),
                             std::string("/a\0b", 4)})
        EXPECT_EQ(Refusal(path), "not an absolute path");
    std::ofstream(Home() + "/file").close();
    EXPECT_EQ(Refusal(Home() + "/file/x"), Home() + "/file is no directory");
    EXPECT_THAT(Refusal(Home() + "/" + std::string(300, 'n')), HasSubstr("File name too long"));
}

TEST_F(TheSafeDirectory, DoesNotMakeADeepTree) {
    std::string deep = Home();
    for (std::size_t i = 0; i < SafeDirectory::MAX_LEVELS; ++i)
        deep += "/d";
    EXPECT_EQ(Refusal(deep + "/d"), "the path has too many levels");
    EXPECT_TRUE(fs::is_empty(Home()));
    EXPECT_EQ(Refusal(deep), "");
}

TEST_F(TheSafeDirectory, GivesUpOnLinksThatLeadInACircle) {
    fs::create_symlink(Home() + "/b", Home() + "/a");
    fs::create_symlink("a", Home() + "/b");
    EXPECT_EQ(Refusal(Home() + "/a/x"), "too many links");
}

TEST_F(TheSafeDirectory, HoldsTheTargetOfALinkToTheSameRule) {
    fs::create_directory_symlink(Outside(), Home() + "/away");
    fs::create_directory_symlink("../" + fs::path(Outside()).filename().string(), Home() + "/relative");
    EXPECT_EQ(Refusal(Home() + "/away/x"), "/tmp may be written by other users");
    EXPECT_EQ(Refusal(Home() + "/relative/x"), "/tmp may be written by other users");
}

TEST_F(TheSafeDirectory, RefusesWhatAnotherUserPlantedBelowTheDataDirectory) {
    if (!OtherUser::CanBeMade())
        GTEST_SKIP() << "only root can give files to another user";
    fs::create_directory(Home() + "/theirs");
    OtherUser::Give(Home() + "/theirs");
    EXPECT_EQ(Refusal(Home() + "/theirs/x"), Home() + "/theirs belongs to another user");
    fs::create_directory(Home() + "/own");
    fs::create_directory_symlink(Home() + "/own", Home() + "/link");
    OtherUser::Give(Home() + "/link");
    EXPECT_EQ(Refusal(Home() + "/link"), "the link " + Home() + "/link belongs to another user");
    fs::create_directories(Home() + "/open/own");
    fs::permissions(Home() + "/open", fs::perms{0777});
    EXPECT_EQ(Refusal(Home() + "/open/own"), Home() + "/open may be written by other users");
}

TEST_F(TheSafeDirectory, LeadsToTheSameDirectoryThoughItsPathIsSwapped) {
    const auto directory = SafeDirectory::Open(Home() + "/db", Home());
    fs::rename(Home() + "/db", Home() + "/moved");
    fs::create_directory_symlink(Outside(), Home() + "/db");
    std::ofstream(directory.PathOf("file")).close();
    EXPECT_TRUE(fs::exists(Home() + "/moved/file"));
    EXPECT_TRUE(fs::is_empty(Outside()));
}
