// The bare parts of a report's way that no other program here measures: what any service needs that does the
// same work. bench/run adds them to a bare receive and a bare insert. The sum is called the floor.

#include <cstdlib>
#include <deque>
#include <mutex>
#include <string>
#include <utility>

#include <fcntl.h>
#include <unistd.h>

#include <benchmark/benchmark.h>
#include <simdjson.h>

#include "bench/Report.h"

namespace {

/// Writes the log line of a report to a file on the disk of the working directory.
void Write(benchmark::State& state) {
    const std::string line =
        "2026-11-20 10:15:30.123 INFO  [12345:12346] [App/ReportServer:42 Recv] " + ReportOf180Bytes() + "\n";
    std::string name = "floor_bench.XXXXXX";
    const int file = mkostemp(name.data(), O_APPEND | O_CLOEXEC);
    if (file < 0 || unlink(name.c_str()) != 0)
        return state.SkipWithError("cannot make the file");
    for (auto _ : state)
        benchmark::DoNotOptimize(write(file, line.data(), line.size()));
    state.SetItemsProcessed(state.iterations());
    close(file);
}

/// Parses with the fastest parser in Debian. It reads and checks the whole text, because the text comes from
/// outside. The parser's On-Demand interface would skip what is not asked for.
void Parse(benchmark::State& state) {
    const simdjson::padded_string report(ReportOf180Bytes());
    simdjson::dom::parser parser;
    if (parser.parse(report).error() != simdjson::SUCCESS)
        return state.SkipWithError("the report is no JSON");
    for (auto _ : state)
        benchmark::DoNotOptimize(parser.parse(report).error());
    state.SetItemsProcessed(state.iterations());
}

/// Copies the text into a queue and out of it, under a lock, on one thread: no thread waits for another.
void Queue(benchmark::State& state) {
    const std::string report = ReportOf180Bytes();
    constexpr std::size_t WAITING = 100;
    std::mutex mutex;
    std::deque<std::string> queue(WAITING, report);
    for (auto _ : state) {
        {
            const std::lock_guard lock(mutex);
            queue.push_back(report);
        }
        const std::lock_guard lock(mutex);
        const std::string first = std::move(queue.front());
        queue.pop_front();
        benchmark::DoNotOptimize(first.data());
    }
    state.SetItemsProcessed(state.iterations());
}

} // namespace

BENCHMARK(Write)->Iterations(200'000); // 50 MB; with more, the disk would be measured, too
BENCHMARK(Parse);
BENCHMARK(Queue);
