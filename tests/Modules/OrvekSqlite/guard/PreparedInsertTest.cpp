#include <SQLiteCpp/Database.h>

#include "tests/Modules/OrvekSqlite/SqliteFixture.h"

// Inserts that differ only in their literals are compiled once. No caller sees a difference: the stored rows
// and the errors are the same as when SQLite itself runs these texts.
namespace {

class PreparedInsert : public SqliteFixture {
protected:
    void SetUp() override {
        SqliteFixture::SetUp();
        MakeStore(Store());
        MakeStore(Plain());
        ASSERT_TRUE(Plugin()->Open(Store())) << Plugin()->GetLastErrorMsg();
        Run(Insert("the first is compiled")); // later inserts reuse it
    }

    std::string Plain() const { return Directory() + "/Plain.db"; }

    /// Runs the text through the plug-in and through SQLite itself. Expects the same of both: success, or the
    /// same error.
    void Run(const std::string& sql) {
        const bool done = Plugin()->ExecSql(sql);
        try {
            SQLite::Database(Plain(), SQLite::OPEN_READWRITE).exec(sql);
            EXPECT_TRUE(done) << Plugin()->GetLastErrorMsg() << ": " << sql;
        } catch (const SQLite::Exception& error) {
            EXPECT_FALSE(done) << sql;
            EXPECT_EQ(Plugin()->GetLastErrorMsg(), error.what()) << sql;
        }
    }

    /// Runs another program's statement in both databases.
    void Change(const std::string& sql) {
        for (const auto& path : {Store(), Plain()})
            SQLite::Database(path, SQLite::OPEN_READWRITE, 5000).exec(sql);
    }

    /// Every value of every row, with its type and its bytes.
    static std::string Contents(const std::string& path) {
        return Ask(
            path,
            "select group_concat(id || typeof(eventID) || hex(eventID) || typeof(value) || hex(value) || "
            "createTime || typeof(pType) || pType || extData3 || hex(extData4), x'0a') from OperLog");
    }

    void ExpectTheSameRows() {
        EXPECT_EQ(Contents(Store()), Contents(Plain()));
        EXPECT_EQ(Rows(Store()), Rows(Plain()));
    }
};

} // namespace

TEST_F(PreparedInsert, StoresWhatSqliteStoresForTheSameText) {
    for (const std::string& text :
         {std::string(), std::string("it''s"), std::string("''"), std::string("''''"),
          std::string("a''''b''"), std::string("\xff\xfe\xc0\x80"), std::string("\xf0\x9f\x98\x80"),
          std::string("%s {} ? :a --"), std::string("12"), std::string("\r\n\t\x1b"),
          std::string(100'000, 'x')})
        Run(Insert("B1|" + text, text, text, "1", text, text));
    for (const auto* number : {"0", "7", "007", "999999999999999999"})
        Run(Insert("B1", "v", "1", number));
    ExpectTheSameRows();
}

TEST_F(PreparedInsert, StoresWhatSqliteStoresForTextsThatAreNoLiterals) {
    for (const auto* number : {"-1", "1.5", "1e3", "'3'", "null", "9223372036854775807",
                               "9223372036854775808", "1+1", "x'61'", "0 -- and so on"})
        Run(Insert("B1", "v", "1", number));
    Run(Insert("a'||'b"));
    ExpectTheSameRows();
}

TEST_F(PreparedInsert, GivesTheErrorOfTheText) {
    for (const auto* sql :
         {"insert into OperLog (eventID) values('it's')", "insert into OperLog (eventID) values('a','b')",
          "insert into OperLog (eventID,eventID2) values('a','b')",
          "insert into NoSuchTable (eventID) values('a')", "insert into OperLog (eventID) values('a'",
          "insert into OperLog (id) values('no number')", "insert into OperLog (id) values(1)",
          "insert into sqlite_master (name) values('a')", "insert into select (eventID) values('a')",
          "insert into OperLog (eventID,) values('a')"})
        Run(sql);
    ExpectTheSameRows();
}

TEST_F(PreparedInsert, FollowsTheTablesThatAnotherProgramChanges) {
    Change("create table Copy (eventID text)");
    Change("create trigger T after insert on OperLog begin insert into Copy values (new.eventID || "
           "'copied'); end");
    Run(Insert("copied"));
    EXPECT_EQ(Ask(Store(), "select eventID from Copy"), "copiedcopied");
    Change("create unique index U on OperLog (eventID)");
    Run(Insert("copied"));
    Change("drop index U");
    Run(Insert("copied"));
    Change("alter table OperLog drop column extData1");
    Run(Insert("without a column"));
    Change("alter table OperLog rename column extData4 to gone");
    Run(Insert("refused"));
    Change("alter table OperLog rename column gone to extData4");
    Run(Insert("taken again"));
    ExpectTheSameRows();
    Change("drop table OperLog");
    Run(Insert("refused"));
}

TEST_F(PreparedInsert, IsStoppedWhenItsTriggersDoMoreWorkThanIsAllowed) {
    Change("create table Work (n integer)");
    Change("insert into Work with recursive n(i) as (select 1 union all select i + 1 from n limit 2000) "
           "select i from n");
    Change("create trigger T after insert on OperLog when new.eventID = 'too much' begin"
           " update Work set n = n + (select count(*) from Work a where a.n > Work.n); end");
    EXPECT_TRUE(Plugin()->ExecSql(Insert("little"))) << "compiled with the trigger; what follows is not";
    EXPECT_FALSE(Plugin()->ExecSql(Insert("too much")));
    EXPECT_EQ(Plugin()->GetLastErrorMsg(), "interrupted: the statement does more work than is allowed");
}
