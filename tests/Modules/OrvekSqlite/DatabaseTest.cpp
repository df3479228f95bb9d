#include <limits>

#include "tests/Modules/OrvekSqlite/SqliteFixture.h"

namespace {

using Table = std::vector<std::vector<std::string>>;

class OrvekSqlite : public SqliteFixture {
protected:
    void SetUp() override {
        SqliteFixture::SetUp();
        MakeStore(Store());
        ASSERT_TRUE(Plugin()->Open(Store())) << Plugin()->GetLastErrorMsg();
    }

    bool Exec(const std::string& sql) { return Plugin()->ExecSql(sql); }
    std::string Error() { return Plugin()->GetLastErrorMsg(); }
};

TEST_F(OrvekSqlite, StoresTheRowOfTheStoresOwnStatement) {
    ASSERT_TRUE(Exec(Insert("E759|10001", R"({"k":1.5})", "1700000000000", "1", "5.1.0.2", "u1"))) << Error();
    EXPECT_EQ(Ask(Store(), "select id||eventID||value||createTime||pType||extData3||extData4 from OperLog"),
              R"(1E759|10001{"k":1.5}170000000000015.1.0.2u1)");
}

TEST_F(OrvekSqlite, HasNoErrorBeforeTheFirst) {
    EXPECT_EQ(Error(), "");
}

TEST_F(OrvekSqlite, GivesSqlitesOwnWordsForSqlitesErrors) {
    EXPECT_FALSE(Exec("insert into Nowhere values (1)"));
    EXPECT_EQ(Error(), "no such table: Nowhere");
    EXPECT_FALSE(Exec(Insert("it's")));
    EXPECT_EQ(Error(), "near \"s\": syntax error");
}

TEST_F(OrvekSqlite, KeepsTheLastErrorThroughASuccess) {
    EXPECT_FALSE(Exec("nonsense"));
    const auto error = Error();
    EXPECT_TRUE(Exec(Insert("x")));
    EXPECT_EQ(Error(), error);
}

TEST_F(OrvekSqlite, StoresTheNextRowAfterAFailure) {
    EXPECT_FALSE(Exec(Insert("it's")));
    EXPECT_TRUE(Exec(Insert("good"))) << Error();
    EXPECT_EQ(Rows(Store()), "1");
}

TEST_F(OrvekSqlite, StoresDoubledQuotesAsOne) {
    ASSERT_TRUE(Exec(Insert("it''s", "\"quoted\" text"))) << Error();
    EXPECT_EQ(Ask(Store(), "select eventID||value from OperLog"), "it's\"quoted\" text");
}

TEST_F(OrvekSqlite, StoresAValueOfTenKilobytesWhole) {
    const std::string value(10'240, 'x');
    ASSERT_TRUE(Exec(Insert("x", value))) << Error();
    EXPECT_EQ(Ask(Store(), "select value from OperLog"), value);
}

TEST_F(OrvekSqlite, RefusesAStatementOfMoreThanAMegabyte) {
    EXPECT_FALSE(Exec(Insert("x", std::string(1'100'000, 'x'))));
    EXPECT_EQ(Error(), "string or blob too big");
    EXPECT_EQ(Rows(Store()), "0");
}

TEST_F(OrvekSqlite, RefusesAZeroByteWhereverItStands) {
    using namespace std::string_literals;
    for (const auto& sql : {Insert("a\0b"s), Insert("x") + "\0"s, Insert("x") + "\0; drop table OperLog"s}) {
        EXPECT_FALSE(Exec(sql));
        EXPECT_EQ(Error(), "the statement holds a zero byte");
    }
    EXPECT_EQ(Rows(Store()), "0");
}

TEST_F(OrvekSqlite, KeepsBytesThatAreNoUtf8) {
    ASSERT_TRUE(Exec(Insert("\xff\xfe", "\xc3("))) << Error();
    EXPECT_EQ(Ask(Store(), "select hex(eventID)||hex(value) from OperLog"), "FFFEC328");
}

TEST_F(OrvekSqlite, TakesWhiteSpaceCommentsAndSemicolonsAfterTheStatement) {
    for (const auto* tail : {";", " ; ; ", "\n-- note", "/* note */;", "; /* open to the end", ";;--\n;"})
        EXPECT_TRUE(Exec(Insert("x") + tail)) << tail << ": " << Error();
}

TEST_F(OrvekSqlite, RefusesATextWithoutAStatement) {
    for (const auto* text : {"", "  ", "-- note", ";"}) {
        EXPECT_FALSE(Exec(text)) << text;
        EXPECT_EQ(Error(), "the text holds no statement");
    }
}

TEST_F(OrvekSqlite, RunsStatementsOtherThanInsert) {
    ASSERT_TRUE(Exec(Insert("x")) && Exec(Insert("y")));
    EXPECT_TRUE(Exec("update OperLog set value = upper(value) where eventID = 'x'")) << Error();
    EXPECT_TRUE(Exec("delete from OperLog where id in (select max(id) from OperLog)")) << Error();
    EXPECT_TRUE(Exec("create index OperLogTime on OperLog (createTime)")) << Error();
    EXPECT_TRUE(Exec("alter table BaseInfo add column note text")) << Error();
    EXPECT_TRUE(Exec("drop index OperLogTime")) << Error();
    EXPECT_EQ(Ask(Store(), "select group_concat(value) from OperLog"), "V");
}

TEST_F(OrvekSqlite, RefusesWhatNobodyMayDo) {
    for (const std::string sql :
         {"attach ':memory:' as other", "detach main", "pragma user_version = 7", "pragma wal_checkpoint",
          "begin", "commit", "savepoint s", "vacuum", "select load_extension('x')",
          "delete from OperLog where load_extension('x')", "create virtual table v using fts5(x)"}) {
        EXPECT_FALSE(Exec(sql)) << sql;
        EXPECT_EQ(Error().rfind("not authorized", 0), 0u) << sql << ": " << Error();
    }
    EXPECT_TRUE(Exec(Insert("x"))) << "a transaction stayed open: " << Error();
    EXPECT_EQ(Rows(Store()), "1");
}

TEST_F(OrvekSqlite, WritesSqlitesOwnTablesForNobody) {
    EXPECT_FALSE(Exec("insert into sqlite_master (type, name) values ('table', 'x')"));
    EXPECT_FALSE(Exec("update sqlite_master set sql = ''"));
    EXPECT_FALSE(Exec("delete from sqlite_master"));
}

TEST_F(OrvekSqlite, RefusesToExecuteWhatReturnsRows) {
    for (const auto& sql : {std::string("select 1"), std::string("explain delete from OperLog"),
                            std::string("delete from BaseInfo returning 1")}) {
        EXPECT_FALSE(Exec(sql)) << sql;
        EXPECT_EQ(Error(), "not authorized: the statement returns rows");
    }
    EXPECT_EQ(Ask(Store(), "select count(*) from BaseInfo"), "1");
}

TEST_F(OrvekSqlite, LetsTheTablesOwnTriggersAndDefaultsWork) {
    SQLite::Database(Store(), SQLite::OPEN_READWRITE)
        .exec("create table Seen (what text, at text default current_timestamp, check (length(what) < 9));"
              "create trigger t after insert on OperLog begin"
              " insert into Seen (what) select upper(new.eventID); end");
    ASSERT_TRUE(Exec(Insert("abc"))) << Error();
    EXPECT_EQ(Ask(Store(), "select what || (at is not null) from Seen"), "ABC1");
}

TEST_F(OrvekSqlite, StopsATriggerThatWorksWithoutEnd) {
    SQLite::Database(Store(), SQLite::OPEN_READWRITE)
        .exec("create table Much (n); create trigger t after insert on OperLog begin"
              " insert into Much with recursive c(n) as (select 1 union all select n+1 from c)"
              " select n from c; end");
    EXPECT_FALSE(Exec(Insert("abc")));
    EXPECT_EQ(Error(), "interrupted: the statement does more work than is allowed");
    EXPECT_EQ(Ask(Store(), "select count(*) from Much"), "0");
}

TEST_F(OrvekSqlite, CreatesATable) {
    EXPECT_TRUE(Plugin()->CreateTable("create table T (a integer primary key, b text unique)")) << Error();
    EXPECT_TRUE(Plugin()->CreateTable("create table if not exists T (a)")) << Error();
    EXPECT_FALSE(Plugin()->CreateTable("create table T (a)"));
    EXPECT_EQ(Error(), "table T already exists");
    EXPECT_EQ(Ask(Store(), "select count(*) from T"), "0");
}

TEST_F(OrvekSqlite, CreatesNothingButATable) {
    for (const auto& sql :
         {Insert("x"), std::string("drop table OperLog"), std::string("select 1"),
          std::string("create index i on OperLog (id)"),
          std::string("create table A (a); create table B (b)"), std::string("explain create table A (a)")}) {
        EXPECT_FALSE(Plugin()->CreateTable(sql)) << sql;
        EXPECT_EQ(Error().rfind("not authorized", 0), 0u) << sql << ": " << Error();
    }
    EXPECT_EQ(Ask(Store(), "select count(*) from sqlite_master"), "2");
}

TEST_F(OrvekSqlite, RunsABatchInTheOrderOfItsList) {
    ASSERT_TRUE(
        Plugin()->BatExecSql({Insert("a"), "update OperLog set eventID = eventID || 'b'", Insert("c")}))
        << Error();
    EXPECT_EQ(Ask(Store(), "select group_concat(eventID) from OperLog"), "ab,c");
}

TEST_F(OrvekSqlite, RunsAllOfABatchOrNothing) {
    EXPECT_FALSE(Plugin()->BatExecSql({Insert("a"), Insert("b"), "insert into Nowhere values (1)"}));
    EXPECT_EQ(Error(), "no such table: Nowhere");
    EXPECT_EQ(Rows(Store()), "0");
    EXPECT_TRUE(Plugin()->BatExecSql({Insert("a")})) << Error();
    EXPECT_EQ(Rows(Store()), "1");
}

TEST_F(OrvekSqlite, KeepsABatchFromEndingItsTransaction) {
    for (const auto* end : {"commit", "rollback", "end", "release s"})
        EXPECT_FALSE(Plugin()->BatExecSql({Insert("a"), end, Insert("b")})) << end;
    EXPECT_FALSE(
        Plugin()->BatExecSql({Insert("a"), "insert or rollback into OperLog (id) values (1)", Insert("b")}));
    EXPECT_EQ(Rows(Store()), "0");
}

TEST_F(OrvekSqlite, TakesAnEmptyBatch) {
    EXPECT_TRUE(Plugin()->BatExecSql({})) << Error();
}

TEST_F(OrvekSqlite, AppendsTheRowsOfAQuery) {
    Table rows{{"before"}};
    ASSERT_TRUE(Plugin()->QuerySql("select key ,value from BaseInfo ;", rows)) << Error();
    EXPECT_EQ(rows, (Table{{"before"}, {"OpenID", "u1"}}));
}

TEST_F(OrvekSqlite, ReadsNullAsEmptyAndNumbersAsText) {
    Table rows;
    ASSERT_TRUE(Plugin()->QuerySql("select null, 7, 1.5, '', x'61' union all select 1,2,3,4,5", rows));
    EXPECT_EQ(rows, (Table{{"", "7", "1.5", "", "a"}, {"1", "2", "3", "4", "5"}}));
}

TEST_F(OrvekSqlite, ReadsACellWithZeroBytesWhole) {
    Table rows;
    ASSERT_TRUE(Plugin()->QuerySql("select cast(x'610062' as text)", rows)) << Error();
    EXPECT_EQ(rows, (Table{{std::string("a\0b", 3)}}));
}

TEST_F(OrvekSqlite, SucceedsWithoutARowWhenAQueryMatchesNothing) {
    Table rows;
    EXPECT_TRUE(Plugin()->QuerySql("select * from OperLog", rows)) << Error();
    EXPECT_TRUE(rows.empty());
}

TEST_F(OrvekSqlite, LeavesTheRowsAloneWhenAQueryFails) {
    Table rows{{"before"}};
    EXPECT_FALSE(Plugin()->QuerySql("select * from Nowhere", rows));
    EXPECT_FALSE(Plugin()->QuerySql("select 1 union all select abs(-9223372036854775808)", rows));
    EXPECT_EQ(Error(), "integer overflow");
    EXPECT_EQ(rows, (Table{{"before"}}));
}

TEST_F(OrvekSqlite, ChangesNothingThroughAQuery) {
    Table rows;
    for (const auto* sql : {"delete from BaseInfo", "delete from BaseInfo returning key", "begin",
                            "pragma user_version", "drop table OperLog"})
        EXPECT_FALSE(Plugin()->QuerySql(sql, rows)) << sql;
    EXPECT_EQ(Ask(Store(), "select count(*) from BaseInfo"), "1");
}

TEST_F(OrvekSqlite, StopsAQueryWithoutEnd) {
    Table rows;
    EXPECT_FALSE(Plugin()->QuerySql(
        "with recursive c(n) as (select 1 union all select n+1 from c) select n from c where n < 0", rows));
    EXPECT_EQ(Error(), "interrupted: the statement does more work than is allowed");
}

TEST_F(OrvekSqlite, CountsWithTheFirstCell) {
    ASSERT_TRUE(Exec(Insert("a")) && Exec(Insert("b")));
    int count = 7;
    EXPECT_TRUE(Plugin()->GetTotalCount("select count(*), 'more' from OperLog", count)) << Error();
    EXPECT_EQ(count, 2);
    EXPECT_TRUE(Plugin()->GetTotalCount("select -2147483648", count)) << Error();
    EXPECT_EQ(count, std::numeric_limits<int>::min());
}

TEST_F(OrvekSqlite, LeavesTheCountAloneWhenThereIsNone) {
    int count = 7;
    for (const auto* sql : {"select id from OperLog", "select null", "select '2'", "select 2.5"}) {
        EXPECT_FALSE(Plugin()->GetTotalCount(sql, count)) << sql;
        EXPECT_EQ(Error(), "the counting statement returned no number");
    }
    for (const auto* sql : {"select 2147483648", "select -2147483649"}) {
        EXPECT_FALSE(Plugin()->GetTotalCount(sql, count)) << sql;
        EXPECT_EQ(Error(), "the number does not fit");
    }
    EXPECT_FALSE(Plugin()->GetTotalCount("delete from BaseInfo", count));
    EXPECT_EQ(count, 7);
}

TEST_F(OrvekSqlite, OpensAnotherFileInPlaceOfTheFirst) {
    const auto other = Directory() + "/Other.db";
    MakeStore(other);
    ASSERT_TRUE(Plugin()->Open(other)) << Error();
    ASSERT_TRUE(Exec(Insert("x"))) << Error();
    EXPECT_EQ(Rows(Store()), "0");
    EXPECT_EQ(Rows(other), "1");
}

class OrvekSqliteUnopened : public SqliteFixture {};

TEST_F(OrvekSqliteUnopened, FailsEveryOperation) {
    Table rows;
    int count = 7;
    EXPECT_FALSE(Plugin()->ExecSql("create table T (a)"));
    EXPECT_EQ(Plugin()->GetLastErrorMsg(), "unable to open database file");
    EXPECT_FALSE(Plugin()->CreateTable("create table T (a)"));
    EXPECT_FALSE(Plugin()->BatExecSql({}));
    EXPECT_FALSE(Plugin()->QuerySql("select 1", rows));
    EXPECT_FALSE(Plugin()->GetTotalCount("select 1", count));
}

TEST_F(OrvekSqliteUnopened, OpensNothingButAFile) {
    for (const auto& path : {std::string(), std::string(":memory:"), std::string("file::memory:"),
                             Directory(), Store() + std::string("\0x", 2)}) {
        EXPECT_FALSE(Plugin()->Open(path)) << path;
        EXPECT_EQ(Plugin()->GetLastErrorMsg(), "unable to open database file") << path;
    }
}

} // namespace
