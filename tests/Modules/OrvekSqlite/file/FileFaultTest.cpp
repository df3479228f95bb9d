#include <chrono>
#include <fstream>

#include <sys/stat.h>

#include "tests/Modules/OrvekSqlite/SqliteFixture.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/FileContent.h"
#include "tests/support/OtherUser.h"

// Faults of the file, before the service opens it and while the service runs.
namespace {

namespace fs = std::filesystem;

class DatabaseFile : public SqliteFixture {
protected:
    void SetUp() override {
        SqliteFixture::SetUp();
        m_umask = ::umask(0); // as in the service
    }

    void TearDown() override { ::umask(m_umask); }

    bool Exec(const std::string& sql) { return Plugin()->ExecSql(sql); }
    std::string Error() { return Plugin()->GetLastErrorMsg(); }

    void OpenStore() {
        MakeStore(Store());
        ASSERT_TRUE(Plugin()->Open(Store())) << Error();
    }

    static void Overwrite(const std::string& path, const std::string& content) {
        std::ofstream(path, std::ios::binary | std::ios::trunc) << content;
        fs::permissions(path, fs::perms{0600});
    }

    /// Replaces the store by a good database, in one step.
    void ReplaceStore() {
        const auto fresh = Directory() + "/fresh";
        MakeStore(fresh);
        fs::rename(fresh, Store());
    }

    void ExpectEveryFilePrivate() const {
        for (const auto& file : fs::directory_iterator(Directory()))
            EXPECT_EQ(fs::status(file).permissions(), fs::perms{0600}) << file.path();
    }

    /// Becomes an ordinary user, who gets the files, because root may write everything.
    bool BecomeAnOrdinaryUser() const { return OtherUser::BecomeOwnerOf(Directory(), {Store()}); }

private:
    mode_t m_umask = 0;
};

TEST_F(DatabaseFile, IsNotCreatedWhenItIsMissing) {
    EXPECT_FALSE(Plugin()->Open(Store()));
    EXPECT_EQ(Error(), "unable to open database file");
    EXPECT_FALSE(Exec(Insert("x")));
    EXPECT_TRUE(fs::is_empty(Directory()));
}

TEST_F(DatabaseFile, IsUsedOnceItAppears) {
    EXPECT_FALSE(Plugin()->Open(Store()));
    EXPECT_FALSE(Exec(Insert("lost")));
    MakeStore(Store());
    EXPECT_TRUE(Exec(Insert("kept"))) << Error();
    EXPECT_EQ(Ask(Store(), "select group_concat(eventID) from OperLog"), "kept");
}

TEST_F(DatabaseFile, TakesRowsOnceItsTablesAreMade) {
    Overwrite(Store(), "");
    EXPECT_TRUE(Plugin()->Open(Store())) << Error();
    EXPECT_FALSE(Exec(Insert("lost")));
    EXPECT_EQ(Error(), "no such table: OperLog");
    SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec(STORE_TABLES);
    EXPECT_TRUE(Exec(Insert("kept"))) << Error();
    EXPECT_EQ(Rows(Store()), "1");
}

TEST_F(DatabaseFile, IsKeptInWriteAheadMode) {
    SQLite::Database(Store(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE).exec(STORE_TABLES);
    ASSERT_EQ(Ask(Store(), "pragma journal_mode"), "delete");
    ASSERT_TRUE(Plugin()->Open(Store())) << Error();
    EXPECT_EQ(Ask(Store(), "pragma journal_mode"), "wal");
}

TEST_F(DatabaseFile, IsReadableByItsOwnerAloneWhenSetUpMadeIt) {
    OpenStore();
    ASSERT_TRUE(Exec(Insert("x"))) << Error();
    ASSERT_TRUE(fs::exists(Store() + "-wal") && fs::exists(Store() + "-shm"));
    ExpectEveryFilePrivate();
}

TEST_F(DatabaseFile, IsMadePrivateWhenSomebodyElseMadeItReadable) {
    MakeStore(Store());
    fs::permissions(Store(), fs::perms{0644});
    SQLite::Database other(Store(), SQLite::OPEN_READWRITE);
    other.exec("insert into BaseInfo values ('k', 'v')");
    ASSERT_EQ(fs::status(Store() + "-wal").permissions(), fs::perms{0644});

    ASSERT_TRUE(Plugin()->Open(Store())) << Error();
    ASSERT_TRUE(Exec(Insert("x"))) << Error();
    ExpectEveryFilePrivate();
}

TEST_F(DatabaseFile, IsNotOpenedWhileAnotherUserCouldHaveChangedIt) {
    OpenStore();
    ASSERT_TRUE(Exec(Insert("before"))) << Error();
    Plugin()->Open(Directory() + "/none"); // this closes the store
    for (const auto* suffix : {"", "-wal", "-shm", "-journal"}) {
        const auto file = Store() + suffix;
        if (!fs::exists(file))
            Overwrite(file, "");
        fs::permissions(file, fs::perms{0622});
        EXPECT_FALSE(Plugin()->Open(Store()));
        EXPECT_EQ(Error(), file + " may be written by other users");
        EXPECT_FALSE(Exec(Insert("lost")));
        fs::permissions(file, fs::perms{0600});
    }
    fs::permissions(Directory(), fs::perms{0777});
    EXPECT_FALSE(Exec(Insert("lost")));
    EXPECT_EQ(Error(), Directory() + " may be written by other users");
    fs::permissions(Directory(), fs::perms{0700});
    EXPECT_TRUE(Exec(Insert("after"))) << Error();
    EXPECT_EQ(Ask(Store(), "select group_concat(eventID) from OperLog"), "before,after");
}

TEST_F(DatabaseFile, IsFoundThroughASymbolicLink) {
    fs::create_directory(Directory() + "/elsewhere");
    fs::permissions(Directory() + "/elsewhere", fs::perms{0700});
    const auto target = Directory() + "/elsewhere/Real.db";
    MakeStore(target);
    fs::create_symlink(target, Store());
    ASSERT_TRUE(Plugin()->Open(Store())) << Error();
    ASSERT_TRUE(Exec(Insert("x"))) << Error();
    EXPECT_EQ(Rows(target), "1");
}

TEST_F(DatabaseFile, GetsTheRowsAfterItReplacedAnother) {
    OpenStore();
    ASSERT_TRUE(Exec(Insert("old"))) << Error();
    ReplaceStore();
    EXPECT_TRUE(Exec(Insert("new"))) << Error();
    EXPECT_EQ(Ask(Store(), "select group_concat(eventID) from OperLog"), "new");
    EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
}

TEST_F(DatabaseFile, GetsTheBatchAndAnswersTheQueryAfterItReplacedAnother) {
    OpenStore();
    ASSERT_TRUE(Exec(Insert("old"))) << Error();
    ReplaceStore();
    std::vector<std::vector<std::string>> rows;
    EXPECT_TRUE(Plugin()->QuerySql("select eventID from OperLog", rows)) << Error();
    EXPECT_TRUE(rows.empty());
    ReplaceStore();
    EXPECT_TRUE(Plugin()->BatExecSql({Insert("a"), Insert("b")})) << Error();
    EXPECT_EQ(Rows(Store()), "2");
}

TEST_F(DatabaseFile, ReplacesOneThatRefusedTheStatement) {
    OpenStore();
    SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec("drop table OperLog");
    EXPECT_FALSE(Exec(Insert("lost")));
    ReplaceStore();
    EXPECT_TRUE(Exec(Insert("kept"))) << Error();
}

TEST_F(DatabaseFile, IsMissedAfterItsDeletionAndUsedWhenItIsBack) {
    OpenStore();
    ASSERT_TRUE(Exec(Insert("old"))) << Error();
    fs::remove(Store());
    EXPECT_FALSE(Exec(Insert("lost")));
    EXPECT_EQ(Error(), "unable to open database file");
    ReplaceStore();
    EXPECT_TRUE(Exec(Insert("kept"))) << Error();
    EXPECT_EQ(Ask(Store(), "select group_concat(eventID) from OperLog"), "kept");
    EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
}

TEST_F(DatabaseFile, IsUsedAfterItWasDeletedWithItsSideFilesAndMadeAnew) {
    OpenStore();
    ASSERT_TRUE(Exec(Insert("old"))) << Error();
    for (const auto* suffix : {"", "-wal", "-shm"})
        fs::remove(Store() + suffix);
    ReplaceStore();
    EXPECT_TRUE(Exec(Insert("kept"))) << Error();
    EXPECT_EQ(Ask(Store(), "select group_concat(eventID) from OperLog"), "kept");
    EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
}

TEST_F(DatabaseFile, HoldsEveryRowThoughItsSideFilesWereDeletedAndTheProcessKilled) {
    MakeStore(Store());
    ChildProcess writer([&](const auto&) {
        if (!Plugin()->Open(Store()) || !Exec(Insert("first")))
            return 1;
        fs::remove(Store() + "-wal");
        fs::remove(Store() + "-shm");
        for (int i = 0; i < 3000; ++i)
            if (!Exec(Insert("later")))
                return 2;
        int count = 0; // counting commits the last group
        if (!Plugin()->GetTotalCount("select 1", count))
            return 3;
        ::raise(SIGKILL);
        return 4;
    });
    const int status = writer.Wait();
    ASSERT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL) << WEXITSTATUS(status);
    EXPECT_EQ(Rows(Store()), "3001");
    EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
}

/// Only a later statement, or an orderly end, notices that the log is gone.
TEST_F(DatabaseFile, LosesTheRowsOfItsDeletedLogWhenTheProcessIsKilledBeforeTheNextStatement) {
    MakeStore(Store());
    ChildProcess writer([&](const auto&) {
        if (!Plugin()->Open(Store()) || !Exec(Insert("lost")) || Rows(Store()) != "1")
            return 1;
        fs::remove(Store() + "-wal");
        fs::remove(Store() + "-shm");
        return ::raise(SIGKILL);
    });
    EXPECT_EQ(writer.Wait(), 128 + SIGKILL);
    EXPECT_EQ(Rows(Store()), "0");
    EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
}

TEST_F(DatabaseFile, HasEachRowOnceWhenASideFileIsDeletedInABurst) {
    OpenStore();
    for (int i = 0; i < 5000; ++i) {
        if (i % 500 == 250)
            fs::remove(Store() + (i % 1000 < 500 ? "-wal" : "-shm"));
        ASSERT_TRUE(Exec(Insert(std::to_string(i)))) << Error();
    }
    int count = 0;
    ASSERT_TRUE(Plugin()->GetTotalCount("select 1", count)) << "which commits the last group";
    EXPECT_EQ(Ask(Store(), "select count(*) || ' ' || count(distinct eventID) from OperLog"), "5000 5000");
    EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
}

TEST_F(DatabaseFile, TellsOnceThatRowsAreLostWhenAnotherProgramHasBegunALogOfItsOwn) {
    OpenStore();
    ASSERT_TRUE(Exec(Insert("lost"))) << Error();
    fs::remove(Store() + "-wal");
    fs::remove(Store() + "-shm");
    const auto another = "sqlite3 " + Store() + " \"" + Insert("theirs") + "\"";
    ASSERT_EQ(std::system(another.c_str()), 0);
    EXPECT_TRUE(Exec(Insert("kept"))) << Error();
    EXPECT_FALSE(Exec(Insert("refused")));
    EXPECT_EQ(Error(), "the write-ahead log was deleted, and the rows that were only in it are lost");
    EXPECT_TRUE(Exec(Insert("next"))) << Error();
    EXPECT_EQ(Ask(Store(), "select group_concat(eventID) from OperLog"), "theirs,kept,next");
    EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
}

TEST_F(DatabaseFile, KeepsItsRowsWhenItIsMovedAway) {
    OpenStore();
    ASSERT_TRUE(Exec(Insert("old"))) << Error();
    const auto moved = Directory() + "/Moved.db";
    fs::rename(Store(), moved);
    EXPECT_FALSE(Exec(Insert("lost")));
    EXPECT_NE(Ask(moved, "select count(*) from OperLog where eventID = 'old'"), "0");
    EXPECT_EQ(Ask(moved, "pragma integrity_check"), "ok");
}

TEST_F(DatabaseFile, IsNotTouchedWhenItIsNoDatabase) {
    const std::string content(9000, 'x');
    Overwrite(Store(), content);
    EXPECT_FALSE(Plugin()->Open(Store()));
    EXPECT_EQ(Error(), "file is not a database");
    EXPECT_FALSE(Exec(Insert("lost")));
    EXPECT_EQ(ContentOf(Store()), content);

    ReplaceStore();
    EXPECT_TRUE(Exec(Insert("kept"))) << Error();
    EXPECT_EQ(Rows(Store()), "1");
}

TEST_F(DatabaseFile, IsNoticedToBeDamagedWhileItIsOpen) {
    OpenStore();
    ASSERT_TRUE(Exec(Insert("old"))) << Error();
    Overwrite(Store(), std::string(9000, 'x'));
    EXPECT_FALSE(Exec(Insert("lost")));
    EXPECT_EQ(Error(), "file is not a database");
    ReplaceStore();
    EXPECT_TRUE(Exec(Insert("kept"))) << Error();
    EXPECT_EQ(Ask(Store(), "select group_concat(eventID) from OperLog"), "kept");
    EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
}

TEST_F(DatabaseFile, TakesRowsOnceItMayBeWritten) {
    MakeStore(Store());
    fs::permissions(Store(), fs::perms{0400});
    ChildProcess user([&](const auto&) {
        if (!BecomeAnOrdinaryUser())
            return 1;
        (void)Plugin()->Open(Store());
        if (Exec(Insert("lost")) || Error() != "attempt to write a readonly database")
            return 2;
        fs::permissions(Store(), fs::perms{0600});
        // Counting commits the statement, which shares a group because it came soon after another.
        int count = 0;
        return Exec(Insert("kept")) && Plugin()->GetTotalCount("select 1", count) ? 0 : 3;
    });
    EXPECT_EQ(user.Wait(), 0);
    EXPECT_EQ(Rows(Store()), "1");
}

TEST_F(DatabaseFile, GetsTheRowAfterAnotherProcessHeldTheLockForThreeSeconds) {
    MakeStore(Store());
    ChildProcess holder([&](const auto& tell) {
        SQLite::Database database(Store(), SQLite::OPEN_READWRITE);
        database.exec("begin immediate");
        tell();
        ::sleep(3);
        database.exec("commit");
        return 0;
    });
    ASSERT_TRUE(holder.WaitUntilItTold());
    const auto start = std::chrono::steady_clock::now();
    ASSERT_TRUE(Plugin()->Open(Store())) << Error();
    EXPECT_TRUE(Exec(Insert("x"))) << Error();
    EXPECT_GT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(2500));
    EXPECT_EQ(Rows(Store()), "1");
}

TEST_F(DatabaseFile, HoldsTheRowOfAProcessThatWasKilledRightAfterItsStatement) {
    MakeStore(Store());
    for (int killed = 1; killed <= 5; ++killed) {
        ChildProcess writer([&](const auto&) {
            Loader loader(PluginPath());
            if (!loader.GetModule()->Open(Store()) || !loader.GetModule()->ExecSql(Insert("x")))
                return 1;
            ::raise(SIGKILL);
            return 2;
        });
        ASSERT_EQ(writer.Wait(), 128 + SIGKILL);
        EXPECT_EQ(Rows(Store()), std::to_string(killed));
        EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
    }
}

} // namespace
