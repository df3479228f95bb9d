#include "Modules/OrvekSqlite/Database.h"
#include "tests/Modules/OrvekSqlite/SqliteFixture.h"
#include "tests/support/FailingMemory.h"

// The store while memory fails. In each test, one allocation fails, or one and all that follow it; then the
// same for the next allocation.

namespace {

using std::chrono::milliseconds;

OrvekSqlite::GroupSettings EachAlone() {
    OrvekSqlite::GroupSettings settings;
    settings.burstGap = milliseconds(0);
    return settings;
}

OrvekSqlite::GroupSettings AllTogether() {
    OrvekSqlite::GroupSettings settings;
    settings.burstGap = settings.span = settings.retry = std::chrono::hours(1);
    return settings;
}

class StoreWithoutMemory : public SqliteFixture, public ::testing::WithParamInterface<int> {
protected:
    /// Ends the database as DestoryModule does.
    struct End {
        void operator()(OrvekSqlite::Database* database) const {
            EXPECT_TRUE(database->Finish());
            delete database;
        }
    };

    static std::unique_ptr<OrvekSqlite::Database, End> Make(const OrvekSqlite::GroupSettings& group) {
        OrvekSqlite::Settings settings;
        settings.group = group;
        return std::unique_ptr<OrvekSqlite::Database, End>(new OrvekSqlite::Database(settings));
    }

    void SetUp() override {
        SqliteFixture::SetUp();
        MakeStore(Store());
    }

    /// Runs `operation` while memory fails, and keeps its result in m_result. True when an allocation failed.
    template <typename Operation>
    bool WithoutMemory(int first, Operation operation) {
        const FailingMemory memory(first, GetParam());
        m_result = operation();
        return FailingMemory::Failed() > 0;
    }

    static std::string RowsOf(OrvekSqlite::Database& database, const std::string& eventID) {
        std::vector<std::vector<std::string>> rows;
        EXPECT_TRUE(
            database.QuerySql("select count(*) from OperLog where eventID = '" + eventID + "'", rows));
        return rows.empty() ? "none" : rows[0][0];
    }

    bool m_result = false;
};

} // namespace

TEST_P(StoreWithoutMemory, TellsTheTruthOfALoneStatementAndRunsTheNext) {
    const auto database = Make(EachAlone());
    ASSERT_TRUE(database->Open(Store()));
    int first = 1;
    for (bool failed = true; failed; ++first) {
        const std::string eventID = "B" + std::to_string(first);
        const std::string sql = Insert(eventID, "it''s");
        failed = WithoutMemory(first, [&] { return database->ExecSql(sql); });
        EXPECT_EQ(Ask(Store(), "select count(*) from OperLog where eventID = '" + eventID + "'"),
                  m_result ? "1" : "0")
            << "allocation " << first;
        EXPECT_TRUE(m_result || !database->GetLastErrorMsg().empty()) << "allocation " << first;
        ASSERT_TRUE(database->ExecSql(Insert("next"))) << database->GetLastErrorMsg() << " after " << first;
        ASSERT_EQ(Rows(Store()), RowsOf(*database, "next") == std::to_string(first) ? Rows(Store()) : "")
            << "after allocation " << first;
    }
    EXPECT_GT(first, 2) << "allocations were made to fail";
}

TEST_P(StoreWithoutMemory, KeepsTheGroupOfAStatementThatFoundNone) {
    const auto database = Make(AllTogether());
    ASSERT_TRUE(database->Open(Store()));
    int first = 1;
    for (bool failed = true; failed; ++first) {
        const std::string number = std::to_string(first);
        ASSERT_TRUE(database->ExecSql(Insert("before" + number)));
        const std::string sql = Insert("it" + number, std::string(2000, 'x'));
        failed = WithoutMemory(first, [&] { return database->ExecSql(sql); });
        EXPECT_TRUE(m_result || !database->GetLastErrorMsg().empty()) << "allocation " << first;
        ASSERT_TRUE(database->ExecSql(Insert("next" + number)))
            << database->GetLastErrorMsg() << " after " << first;
        ASSERT_EQ(RowsOf(*database, "before" + number), "1") << "allocation " << first;
        ASSERT_EQ(RowsOf(*database, "it" + number), m_result ? "1" : "0") << "allocation " << first;
        ASSERT_EQ(RowsOf(*database, "next" + number), "1") << "allocation " << first;
    }
    EXPECT_GT(first, 2) << "allocations were made to fail";
}

TEST_P(StoreWithoutMemory, KeepsTheGroupWhoseCommitFoundNone) {
    const auto database = Make(AllTogether());
    ASSERT_TRUE(database->Open(Store()));
    int first = 1;
    for (bool failed = true; failed; ++first) {
        ASSERT_TRUE(database->ExecSql(Insert("one")));
        ASSERT_TRUE(database->ExecSql(Insert("two")));
        int count = 0;
        const std::string query = "select count(*) from OperLog";
        failed = WithoutMemory(first, [&] { return database->GetTotalCount(query, count); });
        EXPECT_TRUE(!m_result || count == 2 * first) << "allocation " << first;
        ASSERT_TRUE(database->GetTotalCount(query, count))
            << database->GetLastErrorMsg() << " after " << first;
        ASSERT_EQ(count, 2 * first) << "allocation " << first;
    }
    EXPECT_TRUE(first > 3 || !FailingMemory::FAILS_IN_C) << "allocations were made to fail";
}

TEST_P(StoreWithoutMemory, OpensWithTheNextStatement) {
    int first = 1;
    for (bool failed = true; failed; ++first) {
        const auto database = Make(EachAlone());
        failed = WithoutMemory(first, [&] { return database->Open(Store()); });
        EXPECT_TRUE(m_result || !database->GetLastErrorMsg().empty()) << "allocation " << first;
        ASSERT_TRUE(database->ExecSql(Insert("next"))) << database->GetLastErrorMsg() << " after " << first;
    }
    EXPECT_GT(first, 10) << "allocations were made to fail";
}

INSTANTIATE_TEST_SUITE_P(Failing, StoreWithoutMemory, ::testing::Values(1, FailingMemory::ALL),
                         [](const auto& test) {
                             return test.param == 1 ? "AtOneAllocation" : "FromOneAllocationOn";
                         });
