#include <ctime>
#include <map>

#include <sqlite3.h>

#include "tests/Modules/OrvekSqlite/SqliteFixture.h"

// What an attacker may try: the text of a report ends the literal that holds it, and goes on in SQL. Each
// attack is tried in each of the six values of the statement. It must add at most its own row or leave an
// error, and must be over at once.
namespace {

constexpr std::size_t VALUES = 6;
constexpr std::size_t TYPE = 3; ///< the one value without quotes

// Processor time: nothing here waits, and a busy machine must not fail the test.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr double TIME_LIMIT_MS = 1000;
#else
constexpr double TIME_LIMIT_MS = 100;
#endif

/// The statement with `text` as its value number `position`.
std::string StatementWith(std::size_t position, const std::string& text) {
    static constexpr auto HEAD =
        "insert into OperLog (eventID,value,createTime,pType,extData3,extData4) values(";
    std::string sql = HEAD;
    for (std::size_t i = 0; i < VALUES; ++i) {
        const std::string quote = i == TYPE ? "" : "'";
        sql += (i == 0 ? "" : i == 1 ? ", " : ",") + quote + (i == position ? text : "1") + quote;
    }
    return sql + ")";
}

/// A text that makes `expression` part of the value.
std::string AsExpression(std::size_t position, const std::string& expression) {
    return position == TYPE ? "0+(" + expression + ")" : "x'||(" + expression + ")||'";
}

/// A text that gives the remaining columns itself, closes the row and goes on with `tail`. The rest of the
/// service's text becomes a comment.
std::string AsTail(std::size_t position, const std::string& tail) {
    std::string text = position == TYPE ? "0" : "x'";
    for (std::size_t i = position + 1; i < VALUES; ++i)
        text += i == TYPE ? ",7" : ",'own'";
    return text + ")" + tail + " --";
}

class SmuggledStatement : public SqliteFixture {
protected:
    enum class Outcome { Refused, StoredAtMostOneRow };

    void SetUp() override {
        SqliteFixture::SetUp();
        MakeStore(Store());
        ASSERT_TRUE(Plugin()->Open(Store())) << Plugin()->GetLastErrorMsg();
        ASSERT_TRUE(Plugin()->ExecSql(Insert("kept"))) << Plugin()->GetLastErrorMsg();
    }

    void TryEverywhereAsExpression(const std::string& expression, Outcome outcome) {
        for (std::size_t position = 0; position < VALUES; ++position)
            Try(StatementWith(position, AsExpression(position, expression)), outcome);
        ExpectAnUntouchedStore();
    }

    void TryEverywhereAsTail(const std::string& tail, Outcome outcome) {
        for (std::size_t position = 0; position < VALUES; ++position)
            Try(StatementWith(position, AsTail(position, tail)), outcome);
        ExpectAnUntouchedStore();
    }

    /// Expects that the text would be a valid statement without the guard: an attack with a syntax error
    /// proves nothing.
    void ExpectRealSql(const std::string& sql) {
        SQLite::Database bare(Store(), SQLite::OPEN_READWRITE);
        sqlite3_stmt* statement = nullptr;
        EXPECT_EQ(sqlite3_prepare_v2(bare.getHandle(), sql.c_str(), -1, &statement, nullptr), SQLITE_OK)
            << sql << ": " << bare.getErrorMsg();
        sqlite3_finalize(statement);
    }

private:
    void Try(const std::string& sql, Outcome outcome) {
        SCOPED_TRACE(sql.substr(0, 300));
        const auto before = std::stoi(Rows(Store()));
        const auto start = std::clock();
        const bool done = Plugin()->ExecSql(sql);
        EXPECT_LT(static_cast<double>(std::clock() - start) * 1000 / CLOCKS_PER_SEC, TIME_LIMIT_MS);
        EXPECT_EQ(std::stoi(Rows(Store())), before + (done ? 1 : 0));
        EXPECT_TRUE(done || !Plugin()->GetLastErrorMsg().empty());
        if (outcome == Outcome::Refused) {
            EXPECT_FALSE(done);
        }
    }

    void ExpectAnUntouchedStore() {
        EXPECT_TRUE(Plugin()->ExecSql(Insert("after"))) << Plugin()->GetLastErrorMsg();
        EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
        EXPECT_EQ(Ask(Store(), "pragma user_version"), "0");
        EXPECT_EQ(Ask(Store(), "select group_concat(name) from sqlite_master"), "OperLog,BaseInfo");
        EXPECT_EQ(Ask(Store(), "select group_concat(key||value) from BaseInfo"), "OpenIDu1");
        EXPECT_EQ(Ask(Store(), "select eventID||value||pType||extData4 from OperLog where id = 1"),
                  "keptv0visitor");
        for (const auto& file : std::filesystem::directory_iterator(Directory()))
            EXPECT_EQ(file.path().filename().string().rfind("Report.db", 0), 0u) << file.path();
    }
};

/// Attacks that are valid SQL without the guard. The key says what each tries.
const std::map<std::string, std::string> EXPRESSIONS = {
    {"sub-select", "select value from BaseInfo"},
    {"sub-select of values", "values('x')"},
    {"exists", "exists(select 1)"},
    {"membership of a query", "1 in (select 1)"},
    {"membership of a table's rows", "('a','b') in BaseInfo"},
    {"membership of a pragma", "1 in pragma_user_version"},
    {"endless recursion",
     "with recursive c(n) as (select 1 union all select n+1 from c) select n from c where n<0"},
    {"cross join", "select count(*) from OperLog,OperLog a,OperLog b,OperLog c,OperLog d,OperLog e"},
    {"sub-select in a case", "case when 1 then 'x' else (select value from BaseInfo) end"},
    {"schema", "select sql from sqlite_master"},
    {"huge blob", "zeroblob(1000000000)"},
    {"huge text", "printf('%.*c',1000000000,'x')"},
    {"huge hex", "hex(zeroblob(400000000))"},
    {"random blob", "randomblob(1000000000)"},
    {"extension", "load_extension('libm.so.6')"},
    {"like", "'aaaaaaaaaaaaaaaaaaaaaaaaaaaaaaaab' like '%a%a%a%a%a%a%a%a%a%a%a%a%a%a%c'"},
    {"glob", "'aaaaaaaaaaaaaaaaaaaaaaaaaaaaaaaab' glob '*a*a*a*a*a*a*a*a*a*a*a*a*a*a*c'"},
    {"json arrow", "'{\"a\":1}'->'a'"},
    {"json double arrow", "'{\"a\":1}'->>'a'"},
    {"clock", "current_timestamp"},
    {"clock function", "datetime('now')"},
    {"harmless function", "abs(1)"},
    {"parameter", "?"},
    {"named parameter", ":x"},
    {"numbered parameter", "?32000"},
};

const std::map<std::string, std::string> TAILS = {
    {"second statement", "; drop table OperLog;"},
    {"second insert", ";insert into BaseInfo values('k','v');"},
    {"second statement behind a comment", "/* */;/* */delete from OperLog;"},
    {"attach", "; attach '/tmp/x.db' as x;"},
    {"pragma", "; pragma user_version = 7;"},
    {"transaction", "; begin;"},
    {"vacuum", "; vacuum into '/tmp/x.db';"},
    {"load extension", "; select load_extension('libm.so.6');"},
    {"broken second statement", "; select ("},
    {"another row", ",('a','b','c',1,'d','e')"},
    {"another query", " union all select 'a','b','c',1,'d','e'"},
    {"returning a column", " returning eventID"},
    {"returning a literal", " returning 1"},
    {"returning a query", " returning (select value from BaseInfo)"},
    {"upsert", " on conflict(id) do update set value='x'"},
    {"upsert of a query", " on conflict(id) do update set value=(select value from BaseInfo)"},
    {"zero rows by a query", " except select 'a','b','c',1,'d','e'"},
};

class SmuggledExpression : public SmuggledStatement,
                           public testing::WithParamInterface<std::pair<const std::string, std::string>> {};

TEST_P(SmuggledExpression, IsRefusedInEachOfTheSixValues) {
    ExpectRealSql(StatementWith(TYPE, AsExpression(TYPE, GetParam().second)));
    TryEverywhereAsExpression(GetParam().second, Outcome::Refused);
}

class SmuggledTail : public SmuggledStatement,
                     public testing::WithParamInterface<std::pair<const std::string, std::string>> {};

TEST_P(SmuggledTail, IsRefusedBehindEachOfTheSixValues) {
    ExpectRealSql(StatementWith(0, AsTail(0, GetParam().second)));
    TryEverywhereAsTail(GetParam().second, Outcome::Refused);
}

const auto NAME_OF_ATTACK = [](const auto& info) {
    std::string name;
    for (const char c : info.param.first)
        name += c == ' ' || c == '-' || c == '\'' ? '_' : c;
    return name;
};

INSTANTIATE_TEST_SUITE_P(Attacks, SmuggledExpression, testing::ValuesIn(EXPRESSIONS), NAME_OF_ATTACK);
INSTANTIATE_TEST_SUITE_P(Attacks, SmuggledTail, testing::ValuesIn(TAILS), NAME_OF_ATTACK);

TEST_F(SmuggledStatement, WritesItsOwnColumnsIntoItsOwnRowAtMost) {
    for (const auto* tail :
         {"", ";", "/* open", " on conflict do nothing", " on conflict do update set value='x'"})
        TryEverywhereAsTail(tail, Outcome::StoredAtMostOneRow);
    EXPECT_GT(std::stoi(Rows(Store())), 6);
}

TEST_F(SmuggledStatement, MayComputeWithLiterals) {
    for (const auto* expression : {"1+1", "'a'||'b'", "case when 1 then 2 else 3 end", "cast('7' as integer)",
                                   "'a' collate nocase = 'A'", "1 in (1,2,3)", "x'6162'", "null", "-9e999"})
        TryEverywhereAsExpression(expression, Outcome::StoredAtMostOneRow);
    EXPECT_EQ(Ask(Store(), "select count(*) from OperLog where eventID = 'xab'"), "2");
}

TEST_F(SmuggledStatement, FindsNoNamesToRead) {
    for (const auto* expression : {"eventID", "OperLog.value", "rowid", "\"quoted\"", "new.id", "excluded.id",
                                   "raise(abort,'x')", "nosuchfunction(1)"})
        TryEverywhereAsExpression(expression, Outcome::Refused);
}

TEST_F(SmuggledStatement, IsOverAtOnceHoweverMuchItAsksFor) {
    const auto repeated = [](const std::string& text, int times) {
        std::string all;
        for (int i = 0; i < times; ++i)
            all += text;
        return all;
    };
    const auto tenKilobytes = std::string(10'000, 'x');
    for (const auto& expression :
         {repeated("(", 5000) + "1" + repeated(")", 5000), "1" + repeated("+1", 5000),
          "1 in (1" + repeated(",1", 5000) + ")", repeated("not ", 2500) + "1",
          "case 1" + repeated(" when 2 then 3", 700) + " end", "'a'" + repeated("||'a'", 90),
          "'" + tenKilobytes + "'" + repeated("||'" + tenKilobytes + "'", 5), repeated("-", 1) + "1"})
        TryEverywhereAsExpression(expression, Outcome::StoredAtMostOneRow);
    TryEverywhereAsTail(repeated(",('a','b','c',1,'d','e')", 400), Outcome::Refused);
}

} // namespace
