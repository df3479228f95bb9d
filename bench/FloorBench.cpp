// The bare parts of a report's way that no other program measures: what any service would pay that does what
// this one does. bench/run adds them to a bare receive and a bare insert, and calls the sum the floor.

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

/// The log's line of a report, to a file on the disk of the working directory.
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

/// By the fastest parser that Debian has. All of the text is read and checked, since it comes from outside;
/// its On-Demand interface would pass over what is not asked for.
void Parse(benchmark::State& state) {
    const simdjson::padded_string report(ReportOf180Bytes());
    simdjson::dom::parser parser;
    if (parser.parse(report).error() != simdjson::SUCCESS)
        return state.SkipWithError("the report is no JSON");
    for (auto _ : state)
        benchmark::DoNotOptimize(parser.parse(report).error());
    state.SetItemsProcessed(state.iterations());
}

/// A copy of the text in and out, under a lock and on one thread: no thread waits for another.
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

BENCHMARK(Write)->Iterations(200'000); // 50 MB; more would be the disk's work, too
BENCHMARK(Parse);
BENCHMARK(Queue);
