#include <cstdlib>
#include <filesystem>
#include <fstream>

#include <Poco/Format.h>
#include <SQLiteCpp/SQLiteCpp.h>
#include <benchmark/benchmark.h>
#include <fmt/format.h>

#include "App/ReportServer.h"
#include "Common/Paths.h"
#include "Frame/FrameWorker.h"
#include "tests/support/StoreTables.h"
#include "tests/support/TemporaryDirectory.h"

// One report through FrameWorker::Send into a real file, also into files that already have rows. To compare:
// a bare loop of the same statement text.
//
// The bare loop runs first and makes SQLite count every allocation. The plug-in would switch that off in a
// process that has not used SQLite before. So both are a little slower here; in the service, neither is.
namespace {

const std::string VERSION = "3.0.0.0";
const std::string USER = "visitor";

SyncServiceReport::ST_OptLog Record() {
    SyncServiceReport::ST_OptLog log;
    log.eventID = "B100|10001";
    log.value =
        R"({"button":"save","page":"editor","count":3,"ratio":1.5,"text":"a text as people write it"})";
    log.createTime = "1700000000123";
    log.pType = 0;
    return log;
}

/// Makes this many rows at once. They are as Send writes them.
std::string Fill(std::int64_t rows) {
    const auto log = Record();
    return "insert into OperLog (eventID,value,createTime,pType,extData3,extData4)"
           " with recursive n(i) as (select 1 union all select i + 1 from n limit " +
           std::to_string(rows) + ") select '" + log.eventID + "','" + log.value + "','" + log.createTime +
           "',0,'3.0.0.0','visitor' from n";
}

/// A user data directory with a store that has this many rows.
class Store {
public:
    explicit Store(std::int64_t rows = 0) {
        std::filesystem::create_directories(SyncServiceReport::Paths::Databases(m_directory.Path()));
        SQLite::Database database(Path(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
        database.exec("pragma journal_mode=wal");
        database.exec(STORE_TABLES);
        if (rows > 0)
            database.exec(Fill(rows));
        ::setenv("XDG_DATA_HOME", m_directory.Path().c_str(), 1);
    }
    std::string Path() const { return SyncServiceReport::Paths::Store(m_directory.Path()); }

private:
    TemporaryDirectory m_directory;
};

std::string TextByFmt(const SyncServiceReport::ST_OptLog& log) {
    return fmt::format("insert into OperLog (eventID,value,createTime,pType,extData3,extData4) "
                       "values('{}', '{}','{}',{},'{}','{}')",
                       log.eventID, log.value, log.createTime, log.pType, VERSION, USER);
}

std::string TextByPoco(const SyncServiceReport::ST_OptLog& log) {
    return Poco::format("insert into OperLog (eventID,value,createTime,pType,extData3,extData4) "
                        "values('%s', '%s','%s',%d,'%s','%s')",
                        log.eventID, log.value, log.createTime, log.pType, VERSION, USER);
}

void StatementText(benchmark::State& state, std::string (*textOf)(const SyncServiceReport::ST_OptLog&)) {
    const auto log = Record();
    for (auto _ : state)
        benchmark::DoNotOptimize(textOf(log));
}

/// Commits after as many rows as the argument says.
void BareStatements(benchmark::State& state) {
    const Store store;
    SQLite::Database database(store.Path(), SQLite::OPEN_READWRITE);
    database.exec("pragma synchronous=normal");
    const auto log = Record();
    std::int64_t rows = 0;
    for (auto _ : state) {
        const std::string sql = TextByFmt(log);
        if (state.range(0) > 1 && rows % state.range(0) == 0)
            database.exec("begin");
        database.exec(sql);
        if (state.range(0) > 1 && ++rows % state.range(0) == 0)
            database.exec("commit");
    }
    if (state.range(0) > 1 && rows % state.range(0) != 0)
        database.exec("commit");
    state.SetItemsProcessed(state.iterations());
}

void Send(benchmark::State& state) {
    const Store store(state.range(0));
    SyncServiceReport::ReportServer server;
    server.InitBaseInfo();
    SyncServiceReport::FrameWorker worker(&server);
    if (!worker.Init())
        return state.SkipWithError("the SQLite plug-in is not beside this program");
    const auto log = Record();
    for (auto _ : state)
        if (!worker.Send(log))
            return state.SkipWithError("a report was not stored");
    state.SetItemsProcessed(state.iterations());
}

} // namespace

BENCHMARK_CAPTURE(StatementText, Poco, TextByPoco);
BENCHMARK_CAPTURE(StatementText, Fmt, TextByFmt);
BENCHMARK(BareStatements)->ArgName("rows_per_commit")->Arg(1)->Arg(1000);
// The number of reports is fixed: while the library looked for a number, it would fill the file again each
// time.
BENCHMARK(Send)->ArgName("rows_before")->Iterations(200'000)->Arg(0)->Arg(1'000'000)->Arg(5'000'000);
