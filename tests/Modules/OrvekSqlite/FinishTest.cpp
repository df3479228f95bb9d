#include <chrono>
#include <filesystem>
#include <future>
#include <thread>

#include "Modules/OrvekSqlite/Database.h"
#include "tests/Modules/OrvekSqlite/SqliteFixture.h"
#include "tests/support/WaitUntil.h"

// How a database object ends. It is linked directly, without the plug-in.
namespace {

using namespace std::chrono_literals;

class FinishedDatabase : public SqliteFixture {
protected:
    void SetUp() override {
        MakeStore(Store());
        ASSERT_TRUE(m_database.Open(Store()));
    }

    void TearDown() override { (void)m_database.Finish(); }

    /// Waits until an operation on another thread holds the object's lock.
    void WaitUntilBusy() {
        ASSERT_TRUE(WaitUntil([&] {
            m_probe = std::async([&] { return m_database.GetLastErrorMsg(); });
            return m_probe.wait_for(50ms) == std::future_status::timeout;
        }));
    }

    OrvekSqlite::Database m_database;
    std::future<std::string> m_probe;
};

TEST_F(FinishedDatabase, LetsTheOperationUnderWayGoOnAndFailsEveryLaterOne) {
    SQLite::Database other(Store(), SQLite::OPEN_READWRITE);
    other.exec("begin immediate");
    bool stored = false;
    std::thread caller([&] { stored = m_database.ExecSql(Insert("under way")); });
    WaitUntilBusy();
    EXPECT_FALSE(m_database.Finish()) << "it waited for a lock";
    other.exec("rollback");
    caller.join();
    EXPECT_TRUE(stored) << m_database.GetLastErrorMsg();
    EXPECT_FALSE(m_database.ExecSql(Insert("later")));
    EXPECT_EQ(m_database.GetLastErrorMsg(), "the database object is destroyed");
    EXPECT_EQ(Rows(Store()), "1");
}

TEST_F(FinishedDatabase, FailsEveryOperationOnceItIsClosed) {
    EXPECT_TRUE(m_database.ExecSql(Insert("before")));
    EXPECT_TRUE(m_database.Finish());
    EXPECT_FALSE(m_database.ExecSql(Insert("later")));
    EXPECT_EQ(m_database.GetLastErrorMsg(), "the database object is destroyed");
    EXPECT_EQ(Rows(Store()), "1");
}

TEST_F(FinishedDatabase, HasTheRowsOfALogThatWasDeletedWithoutALaterStatement) {
    EXPECT_TRUE(m_database.ExecSql(Insert("before")));
    for (const auto* suffix : {"-wal", "-shm"})
        ASSERT_TRUE(std::filesystem::remove(Store() + suffix));
    EXPECT_TRUE(m_database.Finish());
    EXPECT_EQ(Rows(Store()), "1");
}

} // namespace
