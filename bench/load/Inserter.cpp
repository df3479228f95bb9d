// The least that a store can do: SQLite, the statement text that the service makes of a report, and a commit
// after every so many rows. The text is there already but for its number.

#include <iostream>
#include <string>

#include <CLI/CLI.hpp>
#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>

#include "bench/load/Clocks.h"

namespace {

struct Plan {
    std::string store;
    std::int64_t rows = 0;
    std::int64_t rowsPerCommit = 1000;
};

/// What becomes of the report of 180 bytes.
std::string Statement(std::int64_t number) {
    return fmt::format("insert into OperLog (eventID,value,createTime,pType,extData3,extData4) values("
                       "'B100|10001', '{{\"button\":\"save\",\"page\":\"editor\",\"count\":3,\"ratio\":1.5,"
                       "\"text\":\"a text as people write it\"}}','170{:010}',0,'3.0.0.0','visitor')",
                       number);
}

void InsertAll(SQLite::Database& database, const Plan& plan) {
    for (std::int64_t row = 0; row < plan.rows; ++row) {
        if (plan.rowsPerCommit > 1 && row % plan.rowsPerCommit == 0)
            database.exec("begin");
        database.exec(Statement(row));
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
    CLI11_PARSE(app, argc, argv);

    SQLite::Database database(plan.store, SQLite::OPEN_READWRITE);
    database.exec("pragma journal_mode = wal");
    database.exec("pragma synchronous = normal");
    const std::int64_t begin = MonotonicNs();
    const std::int64_t cpuBegin = NowNs(CLOCK_THREAD_CPUTIME_ID);
    InsertAll(database, plan);
    const std::int64_t cpuNs = NowNs(CLOCK_THREAD_CPUTIME_ID) - cpuBegin;
    const std::int64_t wallNs = MonotonicNs() - begin;
    std::cout << fmt::format(R"({{"rows":{},"seconds":{:.6f},"cpu_ns":{}}})", plan.rows,
                             static_cast<double>(wallNs) / 1e9, cpuNs)
              << std::endl;
    return 0;
}
