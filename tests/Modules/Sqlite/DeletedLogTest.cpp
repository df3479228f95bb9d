#include "Modules/Sqlite/DeletedLog.h"

#include <cstdlib>
#include <filesystem>
#include <memory>

#include <SQLiteCpp/SQLiteCpp.h>
#include <gtest/gtest.h>

#include "Modules/Sqlite/DirectoryVfs.h"
#include "Modules/Sqlite/SafeDirectory.h"
#include "tests/support/TemporaryDirectory.h"

using namespace Sqlite;

namespace fs = std::filesystem;

namespace {

class TheDeletedLog : public ::testing::Test {
protected:
    TheDeletedLog() {
        m_database->exec("pragma journal_mode = wal");
        m_database->exec("create table t (x); insert into t values (1)");
        m_files = std::make_unique<SideFileWatch>(m_path);
    }

    void Remove(const std::string& suffix) const { ASSERT_TRUE(fs::remove(m_path + suffix)); }

    bool Rescue() {
        const bool rescued = RescueDeletedLog(m_database->getHandle(), *m_files);
        m_database.reset();
        return rescued;
    }

    std::string Ask(const std::string& query) const {
        return SQLite::Database(m_path, SQLite::OPEN_READWRITE).execAndGet(query).getString();
    }

    TemporaryDirectory m_directory;
    const std::string m_path = m_directory.Path() + "/o.db";
    std::unique_ptr<SQLite::Database> m_database = Open();
    std::unique_ptr<SideFileWatch> m_files;

private:
    std::unique_ptr<SQLite::Database> Open() const {
        return std::make_unique<SQLite::Database>(m_path, SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
    }
};

} // namespace

TEST_F(TheDeletedLog, IsNoticedFileByFile) {
    EXPECT_TRUE(m_files->AreInPlace());
    Remove("-shm");
    EXPECT_FALSE(m_files->AreInPlace());
    EXPECT_TRUE(m_files->LogIsInPlace());
    Remove("-wal");
    EXPECT_FALSE(m_files->LogIsInPlace());
}

TEST_F(TheDeletedLog, IsBroughtIntoTheDatabase) {
    Remove("-wal");
    Remove("-shm");
    m_database->exec("insert into t values (2)"); // before the deletion was noticed
    EXPECT_TRUE(Rescue());
    EXPECT_EQ(Ask("select group_concat(x) from t"), "1,2");
    EXPECT_EQ(Ask("pragma integrity_check"), "ok");
}

TEST_F(TheDeletedLog, IsReadAgainWhenOnlyItsIndexWasDeleted) {
    Remove("-shm");
    EXPECT_TRUE(Rescue());
    EXPECT_EQ(Ask("select group_concat(x) from t"), "1");
}

TEST_F(TheDeletedLog, IsLostWhenAnotherProgramHasBegunAnother) {
    m_database->exec("pragma wal_checkpoint(truncate); insert into t values (2)");
    Remove("-wal");
    Remove("-shm");
    const auto another = "sqlite3 " + m_path + " 'insert into t values (3)'"; // in a separate process
    ASSERT_EQ(std::system(another.c_str()), 0);
    EXPECT_FALSE(Rescue());
    EXPECT_EQ(Ask("select group_concat(x) from t"), "1,3");
    EXPECT_EQ(Ask("pragma integrity_check"), "ok");
}

TEST_F(TheDeletedLog, IsFoundThroughTheOpenDirectoryAsWell) {
    const auto directory = SafeDirectory::Open(m_directory.Path() + "/db", m_directory.Path());
    const auto path = directory.PathOf("o.db");
    SQLite::Database database(path, SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE | SQLite::OPEN_NOFOLLOW, 0,
                              DirectoryVfs());
    // Everything below must go to the moved directory.
    fs::rename(m_directory.Path() + "/db", m_directory.Path() + "/moved");
    database.exec("pragma journal_mode = wal");
    database.exec("create table t (x)");
    SideFileWatch files(path);
    EXPECT_TRUE(files.AreInPlace());
    EXPECT_TRUE(fs::exists(m_directory.Path() + "/moved/o.db-wal"));
    fs::remove(m_directory.Path() + "/moved/o.db-wal");
    EXPECT_FALSE(files.AreInPlace());
}
