#include <cstdlib>
#include <filesystem>
#include <string>

#include <benchmark/benchmark.h>

#include "App/IntakeWatch.h"
#include "App/PocoTasker.h"
#include "Ledger/Outcome.h"
#include "Ledger/Writer.h"
#include "SystemTool/Platform.h"
#include "bench/Report.h"

// What the ledger adds to the time of a report: all counting from the socket to the store, in a real file. To
// compare: the same without a ledger.
namespace {

using ReportLedger::Outcome;

/// A ledger with its own file.
class Books {
public:
    Books() {
        if (::mkdtemp(m_directory.data()) == nullptr ||
            !m_ledger.Open(m_directory, "0", "", SystemTool::Platform::CoarseTimeMs()))
            std::abort(); // otherwise the counts would be in memory, and the figure would be wrong
    }
    ~Books() { std::filesystem::remove_all(m_directory); }
    Books(const Books&) = delete;
    Books& operator=(const Books&) = delete;

    /// What the receiving thread counts.
    void Receive() {
        m_intake.Received(REPORT_BYTES);
        m_ledger.Queued();
    }

    /// What the consuming thread counts.
    void Handle() {
        const ReportLedger::Handling handling(m_ledger);
        ReportLedger::Ended(Outcome::Stored);
    }

private:
    static constexpr std::size_t REPORT_BYTES = 180;

    std::string m_directory = (std::filesystem::temp_directory_path() / "ssr-bench-XXXXXX").string();
    ReportLedger::Writer m_ledger;
    Poco::Net::DatagramSocket m_socket;
    SyncServiceReport::IntakeWatch m_intake{m_ledger, m_socket};
};

/// Only the counting, on one thread.
void CountedReport(benchmark::State& state) {
    Books books;
    for (auto _ : state) {
        books.Receive();
        books.Handle();
    }
    state.SetItemsProcessed(state.iterations());
}

/// A queue whose consumer does nothing else.
class Tasker final : public PocoTasker<std::string> {
public:
    explicit Tasker(Books* books) : m_books(books) {}

    void Take(const std::string& report) {
        if (m_books != nullptr)
            m_books->Receive();
        Produce(report);
    }

    void End() { m_queue.enqueueNotification(new StopNotification); }

    bool Consume(const std::string& data) override {
        benchmark::DoNotOptimize(data.data());
        if (m_books != nullptr)
            m_books->Handle();
        return true;
    }

private:
    Books* m_books; ///< Null: nothing is counted.
};

/// Into the queue and out of it on one thread, a thousand reports at a time.
void Queued(benchmark::State& state, Books* books) {
    constexpr int REPORTS = 1000;
    const std::string report = ReportOf180Bytes();
    for (auto _ : state) {
        Tasker tasker(books);
        for (int i = 0; i < REPORTS; ++i)
            tasker.Take(report);
        tasker.End();
        tasker.run();
    }
    state.SetItemsProcessed(state.iterations() * REPORTS);
}

void QueuedWithoutLedger(benchmark::State& state) {
    Queued(state, nullptr);
}

void QueuedWithLedger(benchmark::State& state) {
    Books books;
    Queued(state, &books);
}

/// With a consumer thread, as in the service: this shows how much the counters of the two threads slow each
/// other down.
void ToAnotherThread(benchmark::State& state, Books* books) {
    const std::string report = ReportOf180Bytes();
    Tasker tasker(books);
    Poco::Thread consumer;
    consumer.start(tasker);
    for (auto _ : state)
        tasker.Take(report);
    tasker.End();
    consumer.join();
    state.SetItemsProcessed(state.iterations());
}

void ToAnotherThreadWithoutLedger(benchmark::State& state) {
    ToAnotherThread(state, nullptr);
}

void ToAnotherThreadWithLedger(benchmark::State& state) {
    Books books;
    ToAnotherThread(state, &books);
}

void CoarseClock(benchmark::State& state) {
    for (auto _ : state)
        benchmark::DoNotOptimize(SystemTool::Platform::CoarseTimeMs());
}

} // namespace

BENCHMARK(CoarseClock);
BENCHMARK(CountedReport);
BENCHMARK(QueuedWithoutLedger)->Unit(benchmark::kMicrosecond);
BENCHMARK(QueuedWithLedger)->Unit(benchmark::kMicrosecond);
BENCHMARK(ToAnotherThreadWithoutLedger)->UseRealTime();
BENCHMARK(ToAnotherThreadWithLedger)->UseRealTime();
