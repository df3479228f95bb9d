#include "Modules/OrvekSqlite/group/Group.h"

#include <chrono>
#include <filesystem>

#include <SQLiteCpp/Exception.h>

#include "tests/Modules/OrvekSqlite/SqliteFixture.h"
#include "tests/support/WaitUntil.h"

// Groups without a committer thread.
namespace {

using OrvekSqlite::group::Clock;

class TheGroup : public SqliteFixture {
protected:
    void SetUp() override {
        SqliteFixture::SetUp();
        MakeStore(Store());
        m_file.Set(Store());
    }

    /// Runs statements until two come so soon after each other that they share a transaction, and waits until
    /// the transaction is due to be committed.
    void OpenDueGroup() {
        ASSERT_TRUE(WaitUntil([&] {
            m_group.Execute(Insert("x"));
            return m_group.Due().has_value();
        }));
        const auto due = *m_group.Due();
        ASSERT_TRUE(WaitUntil([&] { return Clock::now() >= due; }));
    }

    int CodeOfRefusal() {
        try {
            m_group.Execute(Insert("refused"));
        } catch (const SQLite::Exception& refusal) {
            return refusal.getErrorCode();
        }
        return SQLITE_OK;
    }

    static OrvekSqlite::GroupSettings SeldomTriedAgain() {
        OrvekSqlite::GroupSettings settings;
        settings.retry = std::chrono::hours(1);
        return settings;
    }

    OrvekSqlite::file::LiveFile m_file{OrvekSqlite::Settings()};
    OrvekSqlite::group::Group m_group{m_file, SeldomTriedAgain()};
};

TEST_F(TheGroup, IsCommittedByTheNextStatementOnceItIsDueAlsoByOneThatIsRefused) {
    OpenDueGroup();
    EXPECT_THROW(m_group.Execute("nonsense"), SQLite::Exception);
    EXPECT_FALSE(m_group.Due());
}

TEST_F(TheGroup, ThatIsUncommittedIsNotTriedAgainByAStatementBeforeItsTime) {
    OpenDueGroup();
    const auto aside = Store() + ".aside";
    std::filesystem::rename(Store(), aside);
    EXPECT_THROW(m_group.Commit(), SQLite::Exception);
    std::filesystem::rename(aside, Store());
    EXPECT_EQ(CodeOfRefusal(), SQLITE_CANTOPEN) << "the reason of the commit that failed";
    EXPECT_TRUE(m_group.Due());
    EXPECT_NO_THROW(m_group.Commit());
    EXPECT_FALSE(m_group.Due());
}

TEST_F(TheGroup, IsEmptyOnceTheTableRefusesItsOnlyStatement) {
    ASSERT_TRUE(WaitUntil([&] {
        m_group.Commit();
        m_group.Execute(Insert("twice"));
        return m_group.Due().has_value(); // one statement is kept
    }));
    const auto fresh = Store() + ".fresh";
    MakeStore(fresh);
    SQLite::Database(fresh, SQLite::OPEN_READWRITE)
        .exec("create unique index u on OperLog (eventID); insert into OperLog (eventID) values ('twice')");
    std::filesystem::rename(fresh, Store());
    EXPECT_NO_THROW(m_group.Commit());
    EXPECT_FALSE(m_group.Due());
    EXPECT_EQ(Rows(Store()), "1");
}

} // namespace
