#include <benchmark/benchmark.h>

#include "App/PocoTasker.h"
#include "bench/Report.h"

// One text through the queue: produced and consumed on one thread, so that no thread waits for another.
namespace {

class Tasker final : public PocoTasker<std::string> {
public:
    void End() { m_queue.enqueueNotification(new StopNotification); }

    bool Consume(const std::string& data) override {
        benchmark::DoNotOptimize(data.data());
        return true;
    }
};

void CopyOfTheText(benchmark::State& state) {
    const std::string report = ReportOf180Bytes();
    for (auto _ : state) {
        const std::string copy = report;
        benchmark::DoNotOptimize(copy.data());
    }
    state.SetItemsProcessed(state.iterations());
}

/// Produces and consumes an item while as many items wait as the argument says.
void Item(benchmark::State& state) {
    const std::string report = ReportOf180Bytes();
    for (auto _ : state) {
        Tasker tasker;
        for (std::int64_t i = 0; i < state.range(0); ++i)
            tasker.Produce(report);
        tasker.End();
        tasker.run();
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
}

/// With a consumer thread that waits for each item, as in the service.
void ItemToAnotherThread(benchmark::State& state) {
    const std::string report = ReportOf180Bytes();
    Tasker tasker;
    Poco::Thread consumer;
    consumer.start(tasker);
    for (auto _ : state)
        tasker.Produce(report);
    tasker.End();
    consumer.join();
    state.SetItemsProcessed(state.iterations());
}

} // namespace

BENCHMARK(ItemToAnotherThread)->UseRealTime();
BENCHMARK(CopyOfTheText);
BENCHMARK(Item)->Arg(100)->Arg(10'000)->Arg(1'000'000)->Unit(benchmark::kMicrosecond);
