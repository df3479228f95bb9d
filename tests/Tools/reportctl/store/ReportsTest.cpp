#include "Tools/reportctl/store/Reports.h"

#include <cstdlib>
#include <ctime>

#include "tests/Tools/reportctl/support/ReportctlFixture.h"

namespace {

/// The view as an analyst's program sees it. Another program may have written rows, too.
class ReportsView : public ReportctlFixture {
protected:
    void SetUp() override {
        ASSERT_EQ(RunSetup().exitCode, 0);
        ::setenv("TZ", "UTC-1", 1); // one hour east of UTC: POSIX reverses the sign
        ::tzset();
    }
    void TearDown() override {
        ::unsetenv("TZ");
        ::tzset();
    }

    void Insert(const std::string& values) const {
        SQLite::Database(Store(), SQLite::OPEN_READWRITE)
            .exec("insert into OperLog (eventID, value, createTime, pType, extData3, extData4) values " +
                  values);
    }

    std::string AtOf(const std::string& createTime) const {
        Insert("('e', 'v', " + createTime + ", 0, '', '')");
        return Ask("select coalesce(at, 'NULL') from reports order by id desc limit 1");
    }

    std::string JsonOf(const std::string& value) const {
        Insert("('e', " + value + ", '0', 0, '', '')");
        return Ask("select coalesce(value_json, 'NULL') from reports order by id desc limit 1");
    }
};

TEST_F(ReportsView, HasTheseColumns) {
    Insert("('B100|10001', '{\"page\":\"start\"}', '1700000000123', 0, '5.1.0.2', 'u1')");
    EXPECT_EQ(Ask("select group_concat(name) from pragma_table_info('reports')"),
              "id,at,at_local,event,module,action,value,value_json,openid,suite_version");
    EXPECT_EQ(Ask("select id || ' ' || at || ' ' || at_local || ' ' || event || ' ' || module || ' ' || "
                  "action || ' ' || "
                  "value || ' ' || value_json || ' ' || openid || ' ' || suite_version from reports"),
              "1 2023-11-14T22:13:20.123Z 2023-11-14T23:13:20.123 B100|10001 B100 10001 {\"page\":\"start\"} "
              "{\"page\":\"start\"} u1 5.1.0.2");
}

TEST_F(ReportsView, HasATimeOnlyWhereCreateTimeIsANumberAndADate) {
    EXPECT_EQ(AtOf("'0'"), "1970-01-01T00:00:00.000Z");
    EXPECT_EQ(AtOf("'-1'"), "1969-12-31T23:59:59.999Z");
    EXPECT_EQ(AtOf("'1700000000123.7'"), "2023-11-14T22:13:20.124Z");
    EXPECT_EQ(AtOf("'253402300799999'"), "9999-12-31T23:59:59.999Z");
    for (const auto* none : {"''", "'abc'", "'17abc'", "'0x10'", "NULL", "'253402300800000'", "'1e300'",
                             "'nan'", "'--1'", "'99999999999999999999999'", "x'31'"})
        EXPECT_EQ(AtOf(none), "NULL") << none;
}

TEST_F(ReportsView, SplitsTheEventAtItsFirstBar) {
    Insert("('A|b|c', '', '', 0, '', ''), ('|', '', '', 0, '', ''), ('none', '', '', 0, '', '')");
    EXPECT_EQ(
        Ask("select group_concat(coalesce('<' || module || '|' || action || '>', 'NULL'), ' ') from reports"),
        "<A|b|c> <|> NULL");
}

TEST_F(ReportsView, TakesObjectsAndArraysAloneForJson) {
    EXPECT_EQ(JsonOf("'{\"a\":1}'"), "{\"a\":1}");
    EXPECT_EQ(JsonOf("' [1,2]'"), " [1,2]");
    for (const auto* none : {"'1'", "'\"text\"'", "'null'", "'{'", "'[1,]'", "''", "'hello'", "NULL"})
        EXPECT_EQ(JsonOf(none), "NULL") << none;
}

TEST_F(ReportsView, TakesNothingWithAZeroByteForJson) {
    for (const auto* none :
         {"x'5b5d002c226964223a3939'", "cast(x'5b5d00' as text)", "'[1]' || char(0) || 'garbage'", "x'5b5d'"})
        EXPECT_EQ(JsonOf(none), "NULL") << none;
}

TEST_F(ReportsView, IsMadeInAStoreOfVersionOneThatKeepsItsRows) {
    SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec("drop view reports; pragma user_version = 1");
    Insert("('B100|1', 'v', '1', 0, '', '')");
    const auto outcome = RunSetup();
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_EQ(Ask("pragma user_version"), "2");
    EXPECT_EQ(Ask("select action from reports"), "1");
}

TEST_F(ReportsView, OfAnotherDefinitionIsMadeAnew) {
    SQLite::Database(Store(), SQLite::OPEN_READWRITE)
        .exec("drop view reports; create view reports as select 1 as x");
    EXPECT_EQ(RunSetup().exitCode, 0);
    EXPECT_EQ(Ask("select count(*) from pragma_table_info('reports')"), "10");
}

TEST_F(ReportsView, DoesNotTakeThePlaceOfATable) {
    SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec("drop view reports; create table reports (mine)");
    const auto outcome = RunSetup();
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says("there is something else than a view of the name reports")) << outcome.output;
    EXPECT_EQ(Ask("select name from pragma_table_info('reports')"), "mine");
}

} // namespace
