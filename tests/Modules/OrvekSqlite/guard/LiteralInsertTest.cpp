#include "Modules/OrvekSqlite/guard/LiteralInsert.h"

#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using OrvekSqlite::guard::LiteralInsert;
using ::testing::ElementsAre;

namespace {

/// The literals of an INSERT with these values, without their quotes; integers have a # before them. "none"
/// when the text is left to SQLite.
std::vector<std::string> Values(const std::string& values) {
    const std::string sql = "insert into T (a,b2) values(" + values;
    const auto insert = LiteralInsert::Of(sql);
    if (!insert)
        return {"none"};
    EXPECT_EQ(insert->head, "insert into T (a,b2) values(");
    std::vector<std::string> texts;
    for (const auto& literal : insert->literals)
        texts.push_back((literal.isText ? "" : "#") + std::string(literal.text) +
                        (literal.hasDoubledQuotes ? " doubled" : ""));
    return texts;
}

const auto NONE = ElementsAre("none");

} // namespace

TEST(LiteralInsert, TakesTextsAndIntegersApart) {
    EXPECT_THAT(Values("'one', 'two',3,'')"), ElementsAre("one", "two", "#3", ""));
    EXPECT_THAT(Values("'),(', 'values(' ,'--')"), NONE) << "a blank before a comma is not the store's";
    EXPECT_THAT(Values("'),(', 'values(','--')"), ElementsAre("),(", "values(", "--"));
}

TEST(LiteralInsert, TellsDoubledQuotes) {
    EXPECT_THAT(Values("'it''s','''','''''')"), ElementsAre("it''s doubled", "'' doubled", "'''' doubled"));
}

TEST(LiteralInsert, TakesIntegersOfEighteenDigits) {
    EXPECT_THAT(Values("999999999999999999,007)"), ElementsAre("#999999999999999999", "#007"));
    EXPECT_THAT(Values("1000000000000000000)"), NONE);
}

TEST(LiteralInsert, LeavesEverythingElseToSqlite) {
    for (const auto* values :
         {"",      ")",     "'a'",     "'a",         "'a''",   "'a',)",     "'a';)",
          "'a');", "'a') ", "'a') --", "'a'),('b')", "-1)",    "+1)",       "1.5)",
          "1e5)",  "0x10)", "1 )",     "null)",      "x'61')", "'a'||'b')", "'a' 'b')",
          "?)",    ":a)",   "(1))",    "1+1)",       "\"a\")", "'a'/**/)",  "'a')returning 1"})
        EXPECT_THAT(Values(values), NONE) << values;
}

TEST(LiteralInsert, LeavesAZeroByteToSqlite) {
    EXPECT_THAT(Values(std::string("'a\0b')", 6)), NONE);
}

TEST(LiteralInsert, LeavesTooManyLiteralsToSqlite) {
    std::string most = "1";
    for (std::size_t i = 1; i < LiteralInsert::MAX_LITERALS; ++i)
        most += ",1";
    EXPECT_EQ(Values(most + ")").size(), LiteralInsert::MAX_LITERALS);
    EXPECT_THAT(Values(most + ",1)"), NONE);
}

TEST(LiteralInsert, LeavesAHeadWithAnythingButNamesToSqlite) {
    for (const auto* sql :
         {"values('a')", " insert into T values('a')", "INSERT INTO T VALUES('a')",
          "insert into \"T\" values('a')", "insert into 'T' values('a')", "insert into T/**/values('a')",
          "insert into T (a) --\nvalues('a')", "insert into T select ? values('a')",
          "insert or ignore into T values('a')", "insert into T values ('a')"})
        EXPECT_FALSE(LiteralInsert::Of(sql)) << sql;
}
