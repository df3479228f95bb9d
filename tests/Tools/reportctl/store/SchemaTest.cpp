#include "tests/Tools/reportctl/support/ReportctlFixture.h"
#include "tests/support/StoreTables.h"

namespace {

class StoreMigration : public ReportctlFixture {
protected:
    void ExpectTheCurrentSchema() const {
        EXPECT_EQ(ColumnsOf("OperLog"), OPER_LOG_COLUMNS);
        EXPECT_EQ(ColumnsOf("BaseInfo"), "key TEXT0,value TEXT0");
        EXPECT_EQ(Ask("pragma user_version"), "2");
        EXPECT_EQ(Ask("pragma journal_mode"), "wal");
        EXPECT_EQ(Ask("pragma integrity_check"), "ok");
    }

    /// Expects that set-up fails, prints this reason, and does not change a byte of the store.
    void ExpectLeftAlone(const std::string& reason) const {
        const auto before = ContentOf(Store());
        const auto outcome = RunSetup("--open-id u1");
        EXPECT_EQ(outcome.exitCode, 1);
        EXPECT_TRUE(outcome.Says(reason)) << outcome.output;
        EXPECT_EQ(ContentOf(Store()), before);
    }

    /// Leaves the files that remain when a service runs these statements and is then killed: the changes are
    /// in the write-ahead log only.
    void RunInAServiceThatIsKilled(const std::string& sql) const {
        namespace fs = std::filesystem;
        const auto aside = Data() + "/aside";
        {
            SQLite::Database service(Store(), SQLite::OPEN_READWRITE);
            service.exec("pragma journal_mode = wal");
            service.exec(sql);
            fs::copy(Database(), aside);
        }
        fs::remove_all(Database());
        fs::rename(aside, Database());
        fs::permissions(Database(), fs::perms{0700});
        ASSERT_GT(fs::file_size(Log()), 0u);
    }

    /// Expects this exit code and text of set-up, and that neither the store nor its log changes.
    void ExpectUntouched(const std::string& arguments, int exitCode, const std::string& text) const {
        const auto store = ContentOf(Store());
        const auto log = ContentOf(Log());
        const auto outcome = RunSetup(arguments);
        EXPECT_EQ(outcome.exitCode, exitCode);
        EXPECT_TRUE(outcome.Says(text)) << outcome.output;
        EXPECT_EQ(ContentOf(Store()), store);
        EXPECT_EQ(ContentOf(Log()), log);
    }

    std::string Log() const { return Store() + "-wal"; }

    static constexpr auto OLD_STORE =
        "create table OperLog (id integer primary key, eventID text, value text, createTime text,"
        " pType integer);"
        "insert into OperLog values (7, 'E1', 'v1', '1', 0), (9, 'E2', 'v2', '2', 1);";
};

TEST_F(StoreMigration, FindsTheTablesOfOtherTestsAsItMakesThem) {
    MakeStore(STORE_TABLES);
    ASSERT_EQ(RunSetup().exitCode, 0);
    ExpectTheCurrentSchema();
    const auto made = Ask("select group_concat(sql) from sqlite_master where type = 'table'");
    std::filesystem::remove(Store());
    MakeStore(STORE_TABLES);
    EXPECT_EQ(Ask("select group_concat(sql) from sqlite_master where type = 'table'"), made)
        << "set-up changed them";
}

TEST_F(StoreMigration, AddsWhatAnOlderStoreLacksAndKeepsItsRows) {
    MakeStore(OLD_STORE);
    const auto outcome = RunSetup("--open-id u1");
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_TRUE(outcome.Says("migrated store " + Store() + " (schema version 2) from version 0"))
        << outcome.output;
    ExpectTheCurrentSchema();
    EXPECT_EQ(ModeOf(Store()), 0600u);
    EXPECT_EQ(Ask("select group_concat(id || eventID || value || createTime || pType) from OperLog"),
              "7E1v110,9E2v221");
    EXPECT_EQ(Ask("select value from BaseInfo"), "u1");
    EXPECT_TRUE(RunSetup("--open-id u1").Says("nothing to do"));
}

TEST_F(StoreMigration, ChangesNothingInADryRun) {
    MakeStore(OLD_STORE);
    const auto before = Everything();
    const auto outcome = RunSetup("--dry-run --open-id u1");
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_TRUE(outcome.Says("would migrate store " + Store())) << outcome.output;
    EXPECT_TRUE(Everything() == before);
}

TEST_F(StoreMigration, FillsAnEmptyFile) {
    MakeStore("");
    EXPECT_EQ(RunSetup().exitCode, 0);
    ExpectTheCurrentSchema();
}

TEST_F(StoreMigration, GivesTheRowsAKeyInTheirOrderAndKeepsForeignColumns) {
    MakeStore("create table OperLog (EVENTID text, note varchar(9), value text);"
              "insert into OperLog values ('E1', 'n1', 'v1'), ('E2', null, 'v2');");
    EXPECT_EQ(RunSetup().exitCode, 0);
    EXPECT_EQ(ColumnsOf("OperLog"), std::string(OPER_LOG_COLUMNS) + ",note varchar(9)0");
    EXPECT_EQ(Ask("select group_concat(id || eventID || ifnull(note, '-') || value) from OperLog"),
              "1E1n1v1,2E2-v2");
    EXPECT_EQ(Ask("select count(*) from sqlite_master"), "3");
}

TEST_F(StoreMigration, MakesATableAgainThatSomebodyDropped) {
    ASSERT_EQ(RunSetup().exitCode, 0);
    SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec("drop table BaseInfo");
    EXPECT_EQ(RunSetup().exitCode, 0);
    ExpectTheCurrentSchema();
}

TEST_F(StoreMigration, SwitchesAStoreToTheWriteAheadLog) {
    ASSERT_EQ(RunSetup().exitCode, 0);
    ASSERT_EQ(Ask("pragma journal_mode = delete"), "delete");
    EXPECT_TRUE(RunSetup("--dry-run").Says("would change journal of " + Store()));
    EXPECT_EQ(Ask("pragma journal_mode"), "delete");
    EXPECT_EQ(RunSetup().exitCode, 0);
    ExpectTheCurrentSchema();
}

TEST_F(StoreMigration, LeavesANewerStoreAlone) {
    MakeStore("pragma user_version = 3; create table OperLog (a); create table New (b)");
    ExpectLeftAlone("has schema version 3, this program knows 2: it was left as it is");
}

TEST_F(StoreMigration, LeavesTheLogOfAKilledServiceAloneInADryRun) {
    MakeStore("create table OperLog (id integer primary key, eventID text)");
    RunInAServiceThatIsKilled("insert into OperLog values (1, 'newest')");
    ExpectUntouched("--dry-run --open-id u1", 0, "would migrate store");
    EXPECT_EQ(RunSetup().exitCode, 0);
    EXPECT_EQ(Ask("select eventID from OperLog"), "newest");
    ExpectTheCurrentSchema();
}

TEST_F(StoreMigration, LeavesTheLogOfAKilledServiceAloneWhenThereIsNothingToDo) {
    ASSERT_EQ(RunSetup("--open-id u1").exitCode, 0);
    RunInAServiceThatIsKilled("insert into OperLog (eventID) values ('newest')");
    ExpectUntouched("--open-id u1", 0, "nothing to do");
    EXPECT_EQ(Ask("select eventID from OperLog"), "newest");
}

TEST_F(StoreMigration, LeavesANewerStoreAloneWithTheLogOfAKilledService) {
    MakeStore("create table OperLog (a)");
    RunInAServiceThatIsKilled("pragma user_version = 3");
    ExpectUntouched("--open-id u1", 1, "it was left as it is");
}

TEST_F(StoreMigration, LeavesAFileAloneThatIsNoDatabase) {
    std::filesystem::create_directories(Database());
    std::ofstream(Store()) << std::string(5000, 'x');
    ExpectLeftAlone("file is not a database. It was left as it is. Move it away");
    EXPECT_EQ(RunSetup("--dry-run").exitCode, 1);
}

TEST_F(StoreMigration, LeavesAStoreAloneWhoseIdIsNoKey) {
    MakeStore("create table OperLog (id text, eventID text); insert into OperLog values ('a', 'b')");
    ExpectLeftAlone("the column id of OperLog is not its integer primary key");
}

TEST_F(StoreMigration, LeavesAStoreAloneThatItCannotMigrate) {
    MakeStore("create table OperLog (eventID text primary key) without rowid;"
              "insert into OperLog values ('a')");
    ExpectLeftAlone("no such column: rowid");
}

TEST_F(StoreMigration, LeavesADirectoryAloneThatStandsInForTheStore) {
    std::filesystem::create_directories(Store());
    EXPECT_EQ(RunSetup().exitCode, 1);
    EXPECT_TRUE(std::filesystem::is_directory(Store()));
}

} // namespace
