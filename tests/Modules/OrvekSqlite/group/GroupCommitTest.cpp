#include <algorithm>
#include <chrono>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <utility>

#include "tests/Modules/OrvekSqlite/SqliteFixture.h"
#include "tests/support/Fastest.h"
#include "tests/support/FileContent.h"
#include "tests/support/WaitUntil.h"

// What is committed when, seen through another connection.
namespace {

namespace fs = std::filesystem;
using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

/// What a busy machine may add to ten milliseconds, also with a sanitizer.
constexpr auto ALLOWANCE = 1s;

class GroupCommit : public SqliteFixture {
protected:
    void SetUp() override {
        SqliteFixture::SetUp();
        MakeStore(Store());
        ASSERT_TRUE(Plugin()->Open(Store())) << Error();
    }

    bool Exec(const std::string& sql) { return Plugin()->ExecSql(sql); }
    std::string Error() { return Plugin()->GetLastErrorMsg(); }

    /// So that the next statement comes alone.
    static void LetTenMillisecondsPass() {
        const auto start = Clock::now();
        ASSERT_TRUE(WaitUntil([&] { return Clock::now() - start > 10ms; }));
    }

    /// Runs `count` statements as fast as possible.
    void Burst(int count, const std::string& eventID = "burst") {
        for (int i = 0; i < count; ++i)
            ASSERT_TRUE(Exec(Insert(eventID, std::to_string(i)))) << Error();
    }

    /// The rows that are committed now. No lock is taken, so an open group stays open.
    std::int64_t CommittedRows() const {
        SQLite::Database database(Store(), SQLite::OPEN_READONLY);
        SQLite::Statement statement(database, "select count(*) from OperLog");
        return statement.executeStep() ? statement.getColumn(0).getInt64() : -1;
    }

    bool IsWriteLockFree() const {
        try {
            SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec("begin immediate; rollback");
            return true;
        } catch (const SQLite::Exception&) {
            return false;
        }
    }

    /// Runs a burst until another connection sees that its last statements are not committed yet. Returns the
    /// number of rows.
    std::int64_t OpenGroup() {
        std::int64_t rows = CommittedRows();
        do {
            EXPECT_TRUE(Exec(Insert("a")) && Exec(Insert("b"))) << Error();
            rows += 2;
        } while (CommittedRows() == rows);
        return rows;
    }

    /// The number of commits in the write-ahead log: each ends with a frame that holds the size of the
    /// database. The tests write too few rows for SQLite to begin the log again.
    int Commits() const {
        const std::string content = ContentOf(Store() + "-wal");
        constexpr std::size_t HEADER = 32, FRAME = 24 + 4096;
        int commits = 0;
        for (std::size_t frame = HEADER; frame + FRAME <= content.size(); frame += FRAME)
            commits += content.compare(frame + 4, 4, std::string(4, '\0')) != 0 ? 1 : 0;
        return commits;
    }
};

TEST_F(GroupCommit, HasALoneStatementCommittedWhenExecSqlReturns) {
    for (int row = 1; row <= 20; ++row) {
        LetTenMillisecondsPass();
        ASSERT_TRUE(Exec(Insert("x"))) << Error();
        ASSERT_EQ(CommittedRows(), row);
    }
}

TEST_F(GroupCommit, SharesATransactionAmongTheStatementsOfABurst) {
    const int before = Commits();
    const auto start = Clock::now();
    Burst(3001);
    const auto span = std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - start);
    EXPECT_EQ(Rows(Store()), "3001");
    const int commits = Commits() - before;
    EXPECT_GE(commits, 4) << "one alone, and at most 1,000 in a group";
    EXPECT_LE(commits, 5 + span.count() / 8) << "in " << span.count() << " ms";
}

TEST_F(GroupCommit, IsSeenByOthersBeforeTheBurstEnds) {
    int row = 0;
    ASSERT_TRUE(WaitUntil([&] {
        Burst(100);
        row += 100;
        return CommittedRows() > 1 && CommittedRows() < row;
    }));
}

TEST_F(GroupCommit, ComesAfterTenMillisecondsWhenNothingFollows) {
    auto fastest = Clock::duration::max();
    for (int round = 0; round < 20; ++round) {
        const auto rows = OpenGroup();
        const auto start = Clock::now();
        ASSERT_TRUE(WaitUntil([&] { return CommittedRows() == rows; }));
        const auto took = Clock::now() - start;
        EXPECT_LT(took, 10ms + ALLOWANCE);
        fastest = std::min(fastest, took);
    }
    EXPECT_LE(fastest, 10ms) << "what a busy machine cannot spoil in each of twenty rounds";
}

TEST_F(GroupCommit, ComesInTimeThoughEveryStatementThatFollowsIsRefused) {
    const auto waits = [this] {
        const auto rows = OpenGroup();
        const auto start = Clock::now();
        while (CommittedRows() < rows && Clock::now() - start < 1s)
            for (int i = 0; i < 100; ++i)
                EXPECT_FALSE(Exec(Insert("it's")));
        EXPECT_EQ(CommittedRows(), rows);
    };
    EXPECT_LT(Fastest(waits), 100ms); // a hundred refusals take ten milliseconds with a sanitizer
}

TEST_F(GroupCommit, ComesWhileStatementsAreTooFarApartToFillAGroup) {
    const auto start = Clock::now();
    std::int64_t row = 0;
    ASSERT_TRUE(WaitUntil([&] { // checks once in a millisecond
        EXPECT_TRUE(Exec(Insert("x")));
        ++row;
        return CommittedRows() < row && Clock::now() - start > 100ms;
    }));
    EXPECT_GT(CommittedRows(), 1);
}

TEST_F(GroupCommit, KeepsTheTextsOfFourMegabytesAtMost) {
    const std::string value(1'000'000, 'x');
    for (int row = 1; row <= 20; ++row) {
        ASSERT_TRUE(Exec(Insert("x", value))) << Error();
        ASSERT_GE(CommittedRows(), row - 4);
    }
}

TEST_F(GroupCommit, LeavesTheOthersAloneWhenAStatementFails) {
    Burst(10);
    EXPECT_FALSE(Exec(Insert("it's")));
    EXPECT_EQ(Error(), "near \"s\": syntax error");
    EXPECT_FALSE(Exec("insert into Nowhere values (1)"));
    EXPECT_EQ(Error(), "no such table: Nowhere");
    EXPECT_FALSE(Exec("insert into OperLog (id) values (1)"));
    EXPECT_EQ(Error(), "UNIQUE constraint failed: OperLog.id");
    Burst(10);
    EXPECT_EQ(Rows(Store()), "20");
}

TEST_F(GroupCommit, HoldsNoLockAfterABurstOfFailures) {
    for (int i = 0; i < 10; ++i) {
        EXPECT_FALSE(Exec(Insert("it's")));
        EXPECT_TRUE(IsWriteLockFree());
    }
}

TEST_F(GroupCommit, RestoresTheOthersAfterAStatementThatRollsTheTransactionBack) {
    SQLite::Database(Store(), SQLite::OPEN_READWRITE)
        .exec("create trigger t before insert on OperLog when new.eventID = 'evil' begin"
              " select raise(rollback, 'away with all of it'); end");
    for (int i = 0; i < 5; ++i) {
        Burst(3, "good");
        EXPECT_FALSE(Exec(Insert("evil")));
        EXPECT_EQ(Error(), "away with all of it");
        EXPECT_FALSE(Exec("insert or rollback into OperLog (id) values (1)"));
        EXPECT_EQ(Error(), "UNIQUE constraint failed: OperLog.id");
    }
    Burst(1, "good");
    EXPECT_EQ(Ask(Store(), "select count(*) || group_concat(distinct eventID) from OperLog"), "16good");
    EXPECT_EQ(Ask(Store(), "select group_concat(value, '') from (select value from OperLog order by id)"),
              "0120120120120120");
}

TEST_F(GroupCommit, IsDoneFirstByEveryOtherOperation) {
    std::vector<std::vector<std::string>> cells;
    int count = 0;
    auto rows = OpenGroup();
    ASSERT_TRUE(Plugin()->QuerySql("select count(*) from OperLog", cells)) << Error();
    EXPECT_EQ(cells[0][0], std::to_string(rows));
    EXPECT_EQ(CommittedRows(), rows);

    rows = OpenGroup();
    ASSERT_TRUE(Plugin()->GetTotalCount("select count(*) from OperLog", count)) << Error();
    EXPECT_EQ(count, rows);
    EXPECT_EQ(CommittedRows(), rows);

    rows = OpenGroup();
    ASSERT_TRUE(Plugin()->CreateTable("create table T (a)")) << Error();
    EXPECT_EQ(CommittedRows(), rows);

    rows = OpenGroup();
    EXPECT_FALSE(Plugin()->BatExecSql({Insert("c"), "nonsense"}));
    EXPECT_EQ(CommittedRows(), rows);

    rows = OpenGroup();
    ASSERT_TRUE(Plugin()->Open(Store())) << Error();
    EXPECT_EQ(CommittedRows(), rows);
}

TEST_F(GroupCommit, IsDoneByDestruction) {
    Loader second(PluginPath());
    ASSERT_TRUE(second.GetModule()->Open(Store()));
    for (int i = 0; i < 10; ++i)
        ASSERT_TRUE(second.GetModule()->ExecSql(Insert("x")));
    ASSERT_TRUE(second.Unload());
    EXPECT_EQ(CommittedRows(), 10);
}

TEST_F(GroupCommit, TellsAboutTheLastFailureOfTheCallersOwn) {
    EXPECT_FALSE(Exec("nonsense"));
    const auto error = Error();
    const auto rows = OpenGroup();
    EXPECT_EQ(Error(), error);
    EXPECT_TRUE(WaitUntil([&] { return CommittedRows() == rows; }));
    EXPECT_EQ(Error(), error);
}

/// How often each thread except the caller's gave up the processor.
std::string SwitchesOfOtherThreads() {
    std::string all;
    for (const auto& thread : fs::directory_iterator("/proc/self/task")) {
        if (thread.path().filename() == std::to_string(::getpid()))
            continue;
        std::ifstream status(thread.path() / "status");
        for (std::string line; std::getline(status, line);)
            if (line.starts_with("voluntary_ctxt_switches"))
                all += thread.path().filename().string() + line + "\n";
    }
    return all;
}

TEST_F(GroupCommit, WakesNobodyAtRest) {
#if defined(__SANITIZE_THREAD__)
    GTEST_SKIP() << "the sanitizer has a thread of its own";
#endif
    EXPECT_EQ(SwitchesOfOtherThreads(), "") << "no committer before the first burst";
    const auto rows = OpenGroup();
    ASSERT_TRUE(WaitUntil([&] { return CommittedRows() == rows && IsWriteLockFree(); }));
    std::string before;
    ASSERT_TRUE(WaitUntil([&] { // until the plug-in's thread sleeps again
        const auto last = std::exchange(before, SwitchesOfOtherThreads());
        return last == before;
    }));
    EXPECT_NE(before, "");
    EXPECT_FALSE(WaitUntil([&] { return SwitchesOfOtherThreads() != before; }, 200ms));
}

} // namespace
