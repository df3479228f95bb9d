#include <chrono>
#include <csignal>
#include <filesystem>
#include <functional>
#include <thread>

#include <sqlite3.h>
#include <sys/resource.h>

#include "tests/Modules/OrvekSqlite/SqliteFixture.h"
#include "tests/support/Fastest.h"
#include "tests/support/WaitUntil.h"

// What happens to a group whose commit fails.
namespace {

namespace fs = std::filesystem;
using namespace std::chrono_literals;

class UncommittedGroup : public SqliteFixture {
protected:
    void SetUp() override {
        SqliteFixture::SetUp();
        ::signal(SIGXFSZ, SIG_IGN); // so that the write fails and does not end the process
        ::getrlimit(RLIMIT_FSIZE, &m_unlimited);
        MakeStore(Store());
        ASSERT_TRUE(Plugin()->Open(Store())) << Error();
    }

    void TearDown() override { ::setrlimit(RLIMIT_FSIZE, &m_unlimited); }

    bool Exec(const std::string& sql) { return Plugin()->ExecSql(sql); }
    std::string Error() { return Plugin()->GetLastErrorMsg(); }

    /// From now on, no file can grow. A write then fails in this process as it does on a full disk.
    void MakeFilesFull() {
        auto full = m_unlimited;
        full.rlim_cur = 1;
        ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &full), 0);
    }

    void MakeRoom() { ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &m_unlimited), 0); }

    /// Runs numbered statements until one is refused; returns how many were accepted.
    int ExecUntilRefused(int first = 0) {
        int next = first;
        EXPECT_TRUE(WaitUntil([&] {
            for (int i = 0; i < 100; ++i, ++next)
                if (!Exec(Insert(std::to_string(next))))
                    return true;
            return false;
        }));
        return next;
    }

    static std::string AllUpTo(int count) {
        std::string all;
        for (int i = 0; i < count; ++i)
            all += std::to_string(i) + ",";
        return all;
    }

    static std::string All(const std::string& path) {
        return Ask(path, "select group_concat(eventID || ',', '') from (select * from OperLog order by id)");
    }

    bool WaitForAllUpTo(int count) {
        return WaitUntil([&] { return All(Store()) == AllUpTo(count); });
    }

    /// Makes room while another program holds the lock. The committer tries ten times a second and does not
    /// wait for a lock; this waits until it has found the lock held.
    void MakeRoomUnderALock(SQLite::Database& other) {
        other.exec("begin immediate");
        MakeRoom();
        const auto start = std::chrono::steady_clock::now();
        ASSERT_TRUE(WaitUntil([&] { return std::chrono::steady_clock::now() - start > 300ms; }));
    }

    /// Leaves a group that could not be committed because the disk was full. Returns the number of accepted
    /// statements.
    int LeaveAGroupUncommitted() {
        EXPECT_TRUE(Exec(Insert("0"))) << Error();
        MakeFilesFull();
        const int accepted = ExecUntilRefused(1);
        EXPECT_GT(accepted, 1);
        return accepted;
    }

private:
    rlimit m_unlimited{};
};

TEST_F(UncommittedGroup, IsCommittedInItsOrderByItselfOnceThereIsRoom) {
    const int accepted = LeaveAGroupUncommitted();
    EXPECT_NE(Error(), "");
    MakeRoom();
    EXPECT_TRUE(WaitForAllUpTo(accepted)) << All(Store());
    EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
}

TEST_F(UncommittedGroup, HasNewStatementsFailWithItsErrorAndAtOnce) {
    LeaveAGroupUncommitted();
    const auto error = Error();
    EXPECT_TRUE(error == "disk I/O error" || error == "database or disk is full") << error;
    const auto refuse = [&] {
        for (int i = 0; i < 50; ++i) {
            ASSERT_FALSE(Exec(Insert("refused")));
            ASSERT_EQ(Error(), error);
        }
    };
    EXPECT_LT(Fastest(refuse, 100), 20ms) << "5,000 of them would take more than two seconds";
    MakeRoom();
}

TEST_F(UncommittedGroup, GoesBeforeTheStatementsThatFollow) {
    const int accepted = LeaveAGroupUncommitted();
    MakeRoom();
    ASSERT_TRUE(WaitUntil([&] { return Exec(Insert(std::to_string(accepted))); }));
    EXPECT_TRUE(WaitForAllUpTo(accepted + 1)) << All(Store());
}

TEST_F(UncommittedGroup, LeavesTheLockToOthers) {
    SQLite::Database other(Store(), SQLite::OPEN_READWRITE);
    other.exec("begin immediate; rollback"); // opens all its files before they are full
    const int accepted = LeaveAGroupUncommitted();
    // The lock is free between two attempts of the plug-in, each of which takes it.
    EXPECT_TRUE(WaitUntil([&] {
        return sqlite3_exec(other.getHandle(), "begin immediate; rollback", nullptr, nullptr, nullptr) ==
               SQLITE_OK;
    }));
    EXPECT_EQ(other.execAndGet("select count(*) from OperLog").getInt(), 1) << "more than the lone one";
    MakeRoom();
    EXPECT_TRUE(WaitForAllUpTo(accepted));
}

TEST_F(UncommittedGroup, LosesOnlyTheStatementThatAConstraintRefusesWhenItIsRunAgain) {
    SQLite::Database other(Store(), SQLite::OPEN_READWRITE, 5000);
    other.exec("begin immediate; rollback");
    const int accepted = LeaveAGroupUncommitted();
    MakeRoomUnderALock(other);
    other.exec("create trigger t before insert on OperLog when new.eventID = '1' begin"
               " select raise(rollback, 'not that one'); end; commit");
    EXPECT_TRUE(Exec(Insert(std::to_string(accepted)))) << Error();
    EXPECT_TRUE(WaitUntil([&] { return Rows(Store()) == std::to_string(accepted); })) << All(Store());
    EXPECT_EQ("0,1," + All(Store()).substr(2), AllUpTo(accepted + 1));
}

TEST_F(UncommittedGroup, HasNewStatementsWaitForAnotherProgramsLock) {
    SQLite::Database other(Store(), SQLite::OPEN_READWRITE);
    other.exec("begin immediate; rollback");
    const int accepted = LeaveAGroupUncommitted();
    MakeRoomUnderALock(other);
    const auto start = std::chrono::steady_clock::now();
    std::thread release([&] {
        EXPECT_TRUE(WaitUntil([&] { return std::chrono::steady_clock::now() - start > 200ms; }));
        other.exec("rollback");
    });
    EXPECT_TRUE(Exec(Insert(std::to_string(accepted)))) << Error();
    EXPECT_GT(std::chrono::steady_clock::now() - start, 200ms);
    release.join();
    EXPECT_TRUE(WaitForAllUpTo(accepted + 1)) << All(Store());
}

TEST_F(UncommittedGroup, FailsTheOperationsThatWouldCommitIt) {
    const int accepted = LeaveAGroupUncommitted();
    std::vector<std::vector<std::string>> rows;
    int count = 7;
    EXPECT_FALSE(Plugin()->QuerySql("select 1", rows));
    EXPECT_FALSE(Plugin()->GetTotalCount("select 1", count));
    EXPECT_FALSE(Plugin()->BatExecSql({Insert("x")}));
    MakeRoom();
    EXPECT_TRUE(Plugin()->GetTotalCount("select count(*) from OperLog", count)) << Error();
    EXPECT_EQ(count, accepted);
    EXPECT_EQ(All(Store()), AllUpTo(accepted));
}

TEST_F(UncommittedGroup, SurvivesManyTriesWithoutDoubles) {
    const int accepted = LeaveAGroupUncommitted();
    int tries = 0;
    EXPECT_TRUE(WaitUntil([&] {
        EXPECT_FALSE(Exec(Insert("refused")));
        return ++tries == 400;
    }));
    MakeRoom();
    EXPECT_TRUE(WaitForAllUpTo(accepted)) << All(Store());
}

/// The file changes while a group is open. The group is committed by itself after some milliseconds, so the
/// change may also come just after that. Either way, all statements until the first refusal are in one of the
/// two files, in order, and none is in both.
class ChangedFile : public UncommittedGroup {
protected:
    void ReplaceStore() {
        const auto fresh = Directory() + "/fresh";
        MakeStore(fresh);
        fs::rename(fresh, Store());
    }

    int Burst(int first, int count) {
        for (int i = first; i < first + count; ++i)
            EXPECT_TRUE(Exec(Insert(std::to_string(i)))) << Error();
        return first + count;
    }
};

TEST_F(ChangedFile, HandsTheOpenGroupToTheOneThatReplacesIt) {
    const auto old = Directory() + "/Old.db";
    int next = Burst(0, 50);
    fs::create_hard_link(Store(), old); // so that the test can still read the replaced file
    MakeStore(Directory() + "/fresh");
    next = Burst(next, 50);
    fs::rename(Directory() + "/fresh", Store());
    next = Burst(next, 50);
    // Makes the plug-in look for its file. The test must not open the new file beside the write-ahead log of
    // the old one.
    int count = 0;
    ASSERT_TRUE(Plugin()->GetTotalCount("select count(*) from OperLog", count)) << Error();
    EXPECT_EQ(All(old) + All(Store()), AllUpTo(next));
    EXPECT_NE(Rows(Store()), "0");
    EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
}

TEST_F(ChangedFile, KeepsTheOpenGroupUntilADeletedOneIsBack) {
    const auto old = Directory() + "/Old.db";
    int next = Burst(0, 20);
    fs::rename(Store(), old);
    next = ExecUntilRefused(next);
    EXPECT_EQ(Error(), "unable to open database file");
    ReplaceStore();
    ASSERT_TRUE(WaitUntil([&] { return All(old) + All(Store()) == AllUpTo(next); })) << All(old) << "\n"
                                                                                     << All(Store());
}

TEST_F(ChangedFile, GetsTheGroupOnceItsTableIsMade) {
    const auto old = Directory() + "/Old.db";
    int next = Burst(0, 20);
    fs::rename(Store(), old);
    { SQLite::Database empty(Store(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE); }
    next = ExecUntilRefused(next);
    EXPECT_EQ(Error(), "no such table: OperLog");
    (void)Plugin()->CreateTable("create table OperLog (id integer primary key, eventID text, value text,"
                                " createTime text, pType integer, extData3 text, extData4 text)");
    ASSERT_TRUE(WaitUntil([&] { return All(old) + All(Store()) == AllUpTo(next); })) << All(old) << "\n"
                                                                                     << All(Store());
}

} // namespace
