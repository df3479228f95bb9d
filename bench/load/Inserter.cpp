// Bare SQLite, opened as the plug-in opens it. It inserts the rows that the service makes of reports, and
// commits after a number of rows. Either each row is the text of a statement, which SQLite compiles; the text
// is ready except for the report's number. Or one statement is prepared and gets the values of each row,
// which is the least that a store can do.

#include <iostream>
#include <string>

#include <CLI/CLI.hpp>
#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>
#include <sqlite3.h>

#include "bench/load/Clocks.h"

namespace {

struct Plan {
    std::string store;
    std::int64_t rows = 0;
    std::int64_t rowsPerCommit = 1000;
    bool isPrepared = false;
};

/// The statement that the service makes of the report of 180 bytes.
std::string Statement(std::int64_t number) {
    return fmt::format("insert into OperLog (eventID,value,createTime,pType,extData3,extData4) values("
                       "'B100|10001', '{{\"button\":\"save\",\"page\":\"editor\",\"count\":3,\"ratio\":1.5,"
                       "\"text\":\"a text as people write it\"}}','170{:010}',0,'3.0.0.0','visitor')",
                       number);
}

/// The same row by a statement that is compiled once. All values are bound again for each row, as the values
/// of a report must be.
class PreparedRow {
public:
    explicit PreparedRow(SQLite::Database& database)
        : m_statement(database, "insert into OperLog (eventID,value,createTime,pType,extData3,extData4) "
                                "values(?,?,?,?,?,?)") {}

    void Insert(std::int64_t number) {
        const std::string time = fmt::format("170{:010}", number);
        m_statement.bindNoCopy(1, "B100|10001");
        m_statement.bindNoCopy(2, VALUE);
        m_statement.bindNoCopy(3, time);
        m_statement.bind(4, 0);
        m_statement.bindNoCopy(5, "3.0.0.0");
        m_statement.bindNoCopy(6, "visitor");
        m_statement.exec();
        m_statement.reset();
    }

private:
    static constexpr auto VALUE =
        R"({"button":"save","page":"editor","count":3,"ratio":1.5,"text":"a text as people write it"})";
    SQLite::Statement m_statement;
};

template <typename InsertRow>
void InsertAll(SQLite::Database& database, const Plan& plan, InsertRow insertRow) {
    for (std::int64_t row = 0; row < plan.rows; ++row) {
        if (plan.rowsPerCommit > 1 && row % plan.rowsPerCommit == 0)
            database.exec("begin");
        insertRow(row);
        if (plan.rowsPerCommit > 1 && (row + 1) % plan.rowsPerCommit == 0)
            database.exec("commit");
    }
    if (plan.rowsPerCommit > 1 && plan.rows % plan.rowsPerCommit != 0)
        database.exec("commit");
}

} // namespace

int main(int argc, char** argv) {
    CLI::App app("Inserts rows of reports into a store.", "bench_inserter");
    Plan plan;
    app.add_option("store", plan.store, "A Report.db as reportctl makes it")->required();
    app.add_option("--rows", plan.rows, "How many")->required();
    app.add_option("--rows-per-commit", plan.rowsPerCommit, "1: each is its own transaction");
    app.add_flag("--prepared", plan.isPrepared, "With one statement that is compiled once");
    CLI11_PARSE(app, argc, argv);

    sqlite3_config(SQLITE_CONFIG_MEMSTATUS, 0);
    SQLite::Database database(plan.store, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX);
    database.exec("pragma journal_mode = wal");
    database.exec("pragma synchronous = normal");
    PreparedRow prepared(database);
    const std::int64_t begin = MonotonicNs();
    const std::int64_t cpuBegin = NowNs(CLOCK_THREAD_CPUTIME_ID);
    if (plan.isPrepared)
        InsertAll(database, plan, [&](std::int64_t row) { prepared.Insert(row); });
    else
        InsertAll(database, plan, [&](std::int64_t row) { database.exec(Statement(row)); });
    const std::int64_t cpuNs = NowNs(CLOCK_THREAD_CPUTIME_ID) - cpuBegin;
    const std::int64_t wallNs = MonotonicNs() - begin;
    std::cout << fmt::format(R"({{"rows":{},"seconds":{:.6f},"cpu_ns":{}}})", plan.rows,
                             static_cast<double>(wallNs) / 1e9, cpuNs)
              << std::endl;
    return 0;
}
