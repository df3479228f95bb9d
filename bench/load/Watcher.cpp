// Sees rows appear in the way that another program which reads the database does. It asks again and again
// whether another program has committed, and then reads the numbers of the new rows. It prints the latencies
// as JSON, and also how often it asked, because that limits how exact the latencies are.

#include <algorithm>
#include <iostream>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>
#include <sys/prctl.h>

#include "bench/load/Clocks.h"

namespace {

struct Plan {
    std::string database;
    std::string query; ///< gives id and time of the rows after the id `?1`, ordered by id
    /// Gets the time when each report was seen, at the place of its number; 0 for never.
    std::string stampsFile;
    std::int64_t count = 0;   ///< the watcher ends when it has seen this many reports ...
    int patienceSeconds = 10; ///< ... or none for this long
};

/// The pause between two questions. Without a pause, the watcher would take a core away from the programs
/// that it watches.
constexpr std::int64_t PAUSE_NS = 50'000;

constexpr std::int64_t FIRST_TIME = 1'700'000'000'000; ///< the time of the report with the number 0

class Watcher {
public:
    explicit Watcher(const Plan& plan)
        : m_plan(plan), m_database(plan.database, SQLite::OPEN_READONLY, 10'000),
          m_version(m_database, "pragma data_version"), m_rows(m_database, plan.query),
          m_seen(static_cast<std::size_t>(plan.count)) {
        Version(); // from now on, a change is a commit of another program
    }

    void Watch() {
        std::int64_t version = Version();
        std::int64_t lastNews = MonotonicNs();
        std::int64_t lastLook = lastNews;
        while (m_found < m_plan.count && lastLook - lastNews < m_plan.patienceSeconds * 1'000'000'000LL) {
            SleepUntil(MonotonicNs() + PAUSE_NS);
            const std::int64_t now = MonotonicNs();
            m_gaps.push_back(now - lastLook);
            lastLook = now;
            const std::int64_t newVersion = Version();
            if (newVersion == version)
                continue;
            version = newVersion;
            lastNews = MonotonicNs();
            Read(lastNews);
        }
    }

    const std::vector<std::int64_t>& Seen() const { return m_seen; }
    std::int64_t Found() const { return m_found; }

    /// The time between two questions, as a quantile: a `part` of 0.5 gives the median.
    std::int64_t GapNs(double part) {
        std::sort(m_gaps.begin(), m_gaps.end());
        return m_gaps.empty()
                   ? 0
                   : m_gaps[static_cast<std::size_t>(part * static_cast<double>(m_gaps.size() - 1))];
    }

private:
    std::int64_t Version() {
        m_version.reset();
        m_version.executeStep();
        const std::int64_t version = m_version.getColumn(0).getInt64();
        m_version.reset();
        return version;
    }

    void Read(std::int64_t now) {
        m_rows.bind(1, m_lastId);
        while (m_rows.executeStep()) {
            m_lastId = m_rows.getColumn(0).getInt64();
            const auto number = static_cast<std::size_t>(m_rows.getColumn(1).getInt64() - FIRST_TIME);
            if (number >= m_seen.size())
                continue; // not a report of the sender
            m_seen[number] = now;
            ++m_found;
        }
        m_rows.reset();
    }

    const Plan& m_plan;
    SQLite::Database m_database;
    SQLite::Statement m_version;
    SQLite::Statement m_rows;
    std::vector<std::int64_t> m_seen;
    std::vector<std::int64_t> m_gaps;
    std::int64_t m_lastId = 0;
    std::int64_t m_found = 0;
};

} // namespace

int main(int argc, char** argv) {
    CLI::App app("Notes when each of the sender's reports is seen in a database.", "bench_watcher");
    Plan plan;
    app.add_option("database", plan.database, "Opened for reading only")->required();
    app.add_option("--query", plan.query, "Gives id and time of the rows behind the id ?1")->required();
    app.add_option("--stamps", plan.stampsFile, "File for the times (CLOCK_MONOTONIC, ns)")->required();
    app.add_option("--count", plan.count, "How many reports will come")->required();
    CLI11_PARSE(app, argc, argv);

    ::prctl(PR_SET_TIMERSLACK, 1UL);
    Watcher watcher(plan);
    std::cout << "watching" << std::endl; // the sender may begin now
    watcher.Watch();
    WriteStamps(plan.stampsFile, watcher.Seen());
    std::cout << fmt::format(R"({{"found":{},"gap_ns_p50":{},"gap_ns_p99":{}}})", watcher.Found(),
                             watcher.GapNs(0.5), watcher.GapNs(0.99))
              << std::endl;
    return 0;
}
