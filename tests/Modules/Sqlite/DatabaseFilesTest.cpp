#include "Modules/Sqlite/DatabaseFiles.h"

#include <filesystem>
#include <fstream>

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "Modules/Sqlite/SideFiles.h"
#include "Modules/Sqlite/Trust.h"
#include "tests/support/OtherUser.h"
#include "tests/support/TemporaryDirectory.h"

using namespace Sqlite;

namespace fs = std::filesystem;

namespace {

class TheDatabaseFiles : public ::testing::Test {
protected:
    TheDatabaseFiles() { Make(Database()); }

    std::string Database() const { return m_directory.Path() + "/o.db"; }

    static void Make(const std::string& path) {
        std::ofstream(path).close();
        fs::permissions(path, fs::perms{0600});
    }

    /// Why SQLite must not open the database; empty when it may.
    std::string Refusal() const { return Refusal(Database()); }

    static std::string Refusal(const std::string& path) {
        try {
            RequireOurFiles(path);
            return {};
        } catch (const UnsafePath& refusal) {
            return refusal.what();
        }
    }

    TemporaryDirectory m_directory;
};

} // namespace

TEST_F(TheDatabaseFiles, MayBeOpenedWhenTheyAreTheirUsersOwnOrMissing) {
    EXPECT_EQ(Refusal(), "");
    for (const std::string suffix : SIDE_FILE_SUFFIXES)
        Make(Database() + suffix);
    EXPECT_EQ(Refusal(), "");
    fs::permissions(Database(), fs::perms{0644}); // it does no harm when others can read the database
    EXPECT_EQ(Refusal(), "");
    fs::remove(Database());
    EXPECT_EQ(Refusal(), "") << "SQLite says itself that it is missing";
}

TEST_F(TheDatabaseFiles, AreRefusedWhenOneOfThemMayBeWrittenByOthers) {
    for (const std::string suffix : {"", "-wal", "-shm", "-journal"}) {
        Make(Database() + suffix);
        for (const auto mode : {0620U, 0602U}) {
            fs::permissions(Database() + suffix, fs::perms{mode});
            EXPECT_EQ(Refusal(), Database() + suffix + " may be written by other users");
        }
        fs::permissions(Database() + suffix, fs::perms{0600});
    }
}

TEST_F(TheDatabaseFiles, AreRefusedWhenOneOfThemBelongsToAnotherUser) {
    if (!OtherUser::CanBeMade())
        GTEST_SKIP() << "only root can give files to another user";
    for (const std::string suffix : {"-wal", "-shm", "-journal", ""}) {
        Make(Database() + suffix);
        OtherUser::Give(Database() + suffix);
        EXPECT_EQ(Refusal(), Database() + suffix + " belongs to another user");
        fs::remove(Database() + suffix);
    }
}

TEST_F(TheDatabaseFiles, AreRefusedWhenOneOfThemIsALinkOrAnotherKindOfFile) {
    const auto other = m_directory.Path() + "/other";
    Make(other);
    const auto journal = Database() + "-journal";
    fs::create_symlink(other, journal);
    EXPECT_EQ(Refusal(), journal + " is not a regular file");
    fs::remove(journal);
    fs::create_hard_link(other, journal);
    EXPECT_EQ(Refusal(), journal + " has more than one name");
    fs::remove(journal);
    ASSERT_EQ(::mkfifo(journal.c_str(), 0600), 0);
    EXPECT_EQ(Refusal(), journal + " is not a regular file");
}

TEST_F(TheDatabaseFiles, AreRefusedInADirectoryWhereOthersMayPutMore) {
    fs::permissions(m_directory.Path(), fs::perms{0770});
    EXPECT_EQ(Refusal(), m_directory.Path() + " may be written by other users");
    fs::permissions(m_directory.Path(), fs::perms{01777});
    EXPECT_EQ(Refusal(), m_directory.Path() + " may be written by other users");
    fs::permissions(m_directory.Path(), fs::perms{0755});
    EXPECT_EQ(Refusal(), "");
}

TEST_F(TheDatabaseFiles, AreLookedAtWhereALinkToTheDatabaseLeads) {
    const auto link = m_directory.Path() + "/link";
    fs::create_symlink(Database(), link);
    RequireOurFiles(link);
    Make(Database() + "-wal");
    fs::permissions(Database() + "-wal", fs::perms{0666});
    EXPECT_THROW(RequireOurFiles(link), UnsafePath);
}

TEST_F(TheDatabaseFiles, MayBeReachedThroughLinksThatNoOtherUserCanReplace) {
    const auto link = m_directory.Path() + "/link";
    fs::create_directory(m_directory.Path() + "/shared");
    fs::permissions(m_directory.Path() + "/shared", fs::perms{01777}); // like /tmp: its links stay
    fs::create_symlink("../o.db", m_directory.Path() + "/shared/first");
    fs::create_symlink("shared/first", link);
    EXPECT_EQ(Refusal(link), "");
    fs::remove(Database());
    EXPECT_EQ(Refusal(link), "") << "SQLite says itself that there is nothing";
    fs::create_symlink(link, Database());
    EXPECT_EQ(Refusal(link), "") << "SQLite says itself that the links lead in a circle";
}

TEST_F(TheDatabaseFiles, AreRefusedBehindALinkThatAnotherUserCouldReplace) {
    const auto shared = m_directory.Path() + "/shared";
    fs::create_directory(shared);
    fs::create_symlink(Database(), shared + "/first");
    fs::create_symlink("shared/first", m_directory.Path() + "/link");
    fs::create_directory_symlink(m_directory.Path(), shared + "/directory");
    for (const auto mode : {0777U, 0775U}) {
        fs::permissions(shared, fs::perms{mode});
        for (const auto* path : {"/shared/first", "/link", "/shared/directory/o.db"})
            EXPECT_EQ(Refusal(m_directory.Path() + path), shared + " may be written by other users") << path;
    }
    fs::permissions(shared, fs::perms{0755});
    EXPECT_EQ(Refusal(shared + "/first"), "");
}

TEST_F(TheDatabaseFiles, AreRefusedBehindALinkOfAnotherUser) {
    if (!OtherUser::CanBeMade())
        GTEST_SKIP() << "only root can give files to another user";
    const auto link = m_directory.Path() + "/link";
    fs::create_symlink(Database(), link);
    OtherUser::Give(link);
    EXPECT_EQ(Refusal(link), "the link " + link + " belongs to another user");
    fs::create_directory(m_directory.Path() + "/theirs");
    fs::permissions(m_directory.Path() + "/theirs", fs::perms{01755});
    fs::create_symlink(Database(), m_directory.Path() + "/theirs/link");
    OtherUser::Give(m_directory.Path() + "/theirs");
    EXPECT_EQ(Refusal(m_directory.Path() + "/theirs/link"),
              m_directory.Path() + "/theirs belongs to another user");
}
