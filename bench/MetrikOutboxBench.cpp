// The analytics outbox: how long it takes to store an event, with an empty and with a long outbox, compared
// with bare SQLite; and how fast events are sent to a collector on the loopback address.

#include <fstream>
#include <memory>
#include <string>

#include <SQLiteCpp/SQLiteCpp.h>
#include <benchmark/benchmark.h>

#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"
#include "Modules/MetrikSdk/outbox/Outbox.h"
#include "Modules/MetrikSdk/process/OutboxEngine.h"
#include "tests/Modules/MetrikSdk/support/LoopbackServer.h"
#include "tests/Modules/MetrikSdk/support/SettingsFor.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/WaitUntil.h"

using namespace MetrikSdk;
using namespace std::chrono_literals;

namespace {

const ModuleIdentity MODULE{"A759", "1", "default"};

/// The payload that the service makes of a usual report.
const std::string PAYLOAD =
    R"({"extend":{"hublinkVersion":"5.1.0.2","createTime":"1700000000123"},"eventData":{"button":"ok",)"
    R"("count":3,"ratio":1.5,"openid":"visitor","sys_version":"Debian GNU/Linux 12 (bookworm) 6.1.0"}})";

std::shared_ptr<report::FailureReporter> Reporter() {
    return std::make_shared<report::FailureReporter>(1min);
}

constexpr const char* BARE_SCHEMA = "CREATE TABLE event(id INTEGER PRIMARY KEY, event_id TEXT, payload TEXT)";

void Bare(benchmark::State& state, const char* synchronous) {
    const TemporaryDirectory directory;
    SQLite::Database database(directory.Path() + "/bare.db", SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
    database.exec("PRAGMA journal_mode = WAL");
    database.exec(std::string("PRAGMA synchronous = ") + synchronous);
    database.exec(BARE_SCHEMA);
    SQLite::Statement insert(database, "INSERT INTO event(event_id, payload) VALUES('A759|10001', ?1)");
    for (auto _ : state) {
        insert.bindNoCopy(1, PAYLOAD);
        insert.exec();
        insert.reset();
    }
    state.SetItemsProcessed(state.iterations());
}

void BareSqliteOneCommitEach(benchmark::State& state) {
    Bare(state, "NORMAL");
}

/// What it would take to keep even the last event after a power cut.
void BareSqliteOneSyncEach(benchmark::State& state) {
    Bare(state, "FULL");
}

/// Puts `count` events into the outbox in one transaction, in the form that Append gives them.
void Fill(const std::string& directory, std::int64_t count) {
    if (count == 0)
        return;
    SQLite::Database database(directory + "/MetrikOutbox.db", SQLite::OPEN_READWRITE);
    SQLite::Transaction transaction(database);
    SQLite::Statement insert(
        database, "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < ?1) "
                  "INSERT INTO event(uuid, module, release, sequence, event_id, payload, stored_ms, bytes) "
                  "SELECT printf('01890000-0000-7000-8000-%012d', i), 1, 1, 1 + i, 'A759|10001', ?2, ?3, ?4 "
                  "FROM n");
    insert.bind(1, count);
    insert.bind(2, PAYLOAD);
    insert.bind(3, static_cast<std::int64_t>(WallNow().time_since_epoch().count()));
    insert.bind(4, static_cast<std::int64_t>(PAYLOAD.size()) + 90);
    insert.exec();
    transaction.commit();
    // Writes everything to the disk before the measurement, which would otherwise include it.
    database.exec("PRAGMA wal_checkpoint(TRUNCATE)");
}

/// A new outbox with one event, and `more` events filled in.
std::unique_ptr<outbox::Outbox> MakeOutbox(const std::string& directory, std::int64_t more,
                                           report::Notifier& notifier) {
    auto settings = SettingsFor(directory);
    settings.caps.maxWaitingBytes = std::size_t{4} << 30; // the benchmark may need more than the usual limit
    outbox::Outbox(directory, settings, notifier).Append(MODULE, "A759|10001", PAYLOAD);
    Fill(directory, more);
    return std::make_unique<outbox::Outbox>(directory, settings, notifier);
}

/// Stores an event while this many events wait. Each run first writes as many bytes as the longest outbox
/// needs, and puts what it does not need into another outbox: a disk is slow for some time after such a
/// write.
void StoreAnEvent(benchmark::State& state) {
    constexpr std::int64_t MOST = 1'000'000;
    const TemporaryDirectory directory;
    const TemporaryDirectory unused;
    report::Notifier notifier(1min);
    MakeOutbox(unused.Path(), MOST - state.range(0), notifier);
    const auto outbox = MakeOutbox(directory.Path(), state.range(0), notifier);
    outbox->Open();
    for (auto _ : state)
        if (!outbox->Append(MODULE, "A759|10001", PAYLOAD))
            state.SkipWithError("not stored");
    state.SetItemsProcessed(state.iterations());
}

void EncodeABatch(benchmark::State& state) {
    Batch batch;
    batch.outboxId = "01890000-0000-7000-8000-000000000000";
    batch.releases[1] = MODULE;
    for (int i = 0; i < 512; ++i)
        batch.events.push_back({i, batch.outboxId, 1, i, "A759|10001", PAYLOAD, WallNow(), 300});
    for (auto _ : state)
        benchmark::DoNotOptimize(otlp::EncodeOtlp(batch));
    state.SetItemsProcessed(state.iterations() * 512);
}

/// Uploads until the last of this many events is delivered and deleted.
void UploadEverything(benchmark::State& state) {
    LoopbackServer collector([](const Request&) { return Reply(); });
    otlp::EndpointConfig endpoint;
    endpoint.url = collector.Url() + "/v1/logs";
    endpoint.gzip = state.range(1) != 0;
    for (auto _ : state) {
        state.PauseTiming();
        const TemporaryDirectory directory;
        report::Notifier notifier(1min);
        outbox::Outbox(directory.Path(), SettingsFor(directory.Path()), notifier)
            .Append(MODULE, "A759|10001", PAYLOAD);
        Fill(directory.Path(), state.range(0));
        state.ResumeTiming();
        process::OutboxEngine engine(directory.Path(), SettingsFor(directory.Path()), endpoint, {},
                                     Reporter());
        engine.Open();
        if (!WaitUntil([&] { return engine.Events().Status().waiting == 0; }, 600s))
            state.SkipWithError("not delivered");
    }
    state.SetItemsProcessed(state.iterations() * (state.range(0) + 1));
}

/// Stores events while the uploader uses the machine and the outbox's lock, too.
void StoreWhileUploading(benchmark::State& state) {
    LoopbackServer collector([](const Request&) { return Reply(); });
    otlp::EndpointConfig endpoint;
    endpoint.url = collector.Url() + "/v1/logs";
    const TemporaryDirectory directory;
    process::OutboxEngine engine(directory.Path(), SettingsFor(directory.Path()), endpoint, {}, Reporter());
    for (auto _ : state)
        if (!engine.Events().Append(MODULE, "A759|10001", PAYLOAD))
            state.SkipWithError("not stored");
    state.SetItemsProcessed(state.iterations());
    const auto status = engine.Events().Status();
    state.counters["delivered_meanwhile"] =
        static_cast<double>(status.delivered) / static_cast<double>(status.stored);
}

BENCHMARK(BareSqliteOneCommitEach)->Unit(benchmark::kMicrosecond)->UseRealTime();
BENCHMARK(BareSqliteOneSyncEach)->Unit(benchmark::kMicrosecond)->UseRealTime();
BENCHMARK(StoreAnEvent)
    ->Arg(0)
    ->Arg(1'000'000)
    ->ArgName("waiting")
    ->Unit(benchmark::kMicrosecond)
    ->UseRealTime();
BENCHMARK(StoreWhileUploading)->Unit(benchmark::kMicrosecond)->UseRealTime();
BENCHMARK(EncodeABatch)->Unit(benchmark::kMicrosecond);
BENCHMARK(UploadEverything)
    ->Args({50'000, 0})
    ->Args({50'000, 1})
    ->Args({1'000'000, 0})
    ->ArgNames({"events", "gzip"})
    ->Unit(benchmark::kMillisecond)
    ->UseRealTime();

} // namespace
