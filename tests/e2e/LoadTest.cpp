#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <map>
#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/e2e/support/Service.h"
#include "tests/support/WaitUntil.h"

// A long run of reports at a fixed rate: each one ends somewhere, in order, and the ledger's counts add up.

namespace {

using namespace std::chrono_literals;

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr int REPORTS = 10'000; // a program with a sanitizer is much slower, so a loss there shows nothing
constexpr int RATE = 1'000;     // reports a second
#else
constexpr int REPORTS = 100'000;
constexpr int RATE = 20'000;
#endif

/// How many reports; SSR_LOAD_REPORTS in the environment asks for another number.
int ReportCount() {
    const char* asked = std::getenv("SSR_LOAD_REPORTS");
    return asked != nullptr ? std::atoi(asked) : REPORTS;
}

constexpr int STRETCH = 200'000;     // so many reports that the log still keeps all their lines
constexpr int EVERY_NTH_EVENT = 10;  // every 10th report goes to analytics
constexpr int EVERY_NTH_BROKEN = 97; // every 97th report is no JSON

bool IsBroken(int i) {
    return i % EVERY_NTH_BROKEN == 0;
}
bool IsEvent(int i) {
    return !IsBroken(i) && i % EVERY_NTH_EVENT == 0;
}

std::string Report(int i) {
    const std::string number = std::to_string(i);
    if (IsBroken(i))
        return R"({"eventID":)" + number + "|";
    return R"({"eventID":")" + std::string(IsEvent(i) ? "A759|" : "B1|") + number +
           R"(","value":{"button":"save","page":"editor","count":3,"text":"as people write it"},)"
           R"("createTime":1700000000})";
}

/// Sends the reports at RATE, and calls `look` after every thousand.
template <typename Action>
void SendAtRate(int first, int end, Action look) {
    const auto begin = std::chrono::steady_clock::now();
    for (int i = first; i < end; ++i) {
        const auto due = begin + std::chrono::microseconds(1'000'000LL * (i - first) / RATE);
        if (std::chrono::steady_clock::now() < due)
            std::this_thread::sleep_until(due); // keeps the rate; no condition is waited for
        Service::Send(Report(i));
        if (i % 1000 == 0)
            look();
    }
}

/// Counts each line of the log once, if it is called often enough: before the logger deletes its oldest file.
class LogCount {
public:
    explicit LogCount(std::string directory) : m_directory(std::move(directory)) {}

    void Continue() {
        for (const auto& entry : std::filesystem::directory_iterator(m_directory)) {
            std::ifstream log(entry.path());
            std::string first;
            std::getline(log, first);
            std::streamoff& read = m_read[first]; // the first line stays the same when a file is rotated
            log.seekg(read);
            for (std::string line; std::getline(log, line) && !log.eof();) { // a line without its end waits
                read += static_cast<std::streamoff>(line.size()) + 1;
                m_refused += line.find("[App/ReportServer:123 JsonToStruct]") != std::string::npos ? 1 : 0;
                m_received += line.find("[App/ReportServer:42 Recv]") != std::string::npos ? 1 : 0;
            }
        }
    }
    int Refused() const { return m_refused; }
    int Received() const { return m_received; }

private:
    std::string m_directory;
    /// How many bytes of each file have been read. The key is the file's first line.
    std::map<std::string, std::streamoff> m_read;
    int m_refused = 0;
    int m_received = 0;
};

} // namespace

TEST(Load, EveryReportEndsSomewhereInOrder) {
    Service service;
    service.Install();
    service.Start();
    const int sent = ReportCount();
    LogCount log(service.DataDirectory() + "/hublink/log/metrik");
    int stretches = 0;
    for (int first = 0; first < sent; first += STRETCH, ++stretches) {
        SendAtRate(first, std::min(first + STRETCH, sent), [&] { ASSERT_TRUE(service.Books().balanced); });
        service.AwaitQuiet();
        log.Continue();
    }

    const auto rows = service.RowCount();
    const auto events = service.Count(service.OutboxFile(), "select count(*) from event");
    const auto dropped = Service::DroppedByKernel();
    RecordProperty("dropped", std::to_string(dropped));
    EXPECT_EQ(sent, rows + events + log.Refused() + dropped);
    EXPECT_EQ(dropped, 0) << "at this rate the receiver keeps up";
    EXPECT_TRUE(WaitUntil([&] {
        log.Continue();
        return log.Received() == sent + stretches - dropped;
    })) << "with the markers, each one is in the log; there are "
        << log.Received();

    const auto counted = [&](ReportLedger::Outcome outcome) {
        return static_cast<std::int64_t>(service.Counted(outcome));
    };
    EXPECT_EQ(counted(ReportLedger::Outcome::Stored), rows + stretches);
    EXPECT_EQ(counted(ReportLedger::Outcome::ToAnalytics), events);
    EXPECT_EQ(counted(ReportLedger::Outcome::NotJson), log.Refused());
    EXPECT_TRUE(service.Books().balanced);

    int events_expected = 0;
    int refused_expected = 0;
    for (int i = 0; i < sent; ++i) {
        events_expected += IsEvent(i) ? 1 : 0;
        refused_expected += IsBroken(i) ? 1 : 0;
    }
    EXPECT_EQ(events, events_expected);
    EXPECT_EQ(log.Refused(), refused_expected);

    const std::string outOfOrder =
        "select count(*) from (select cast(substr(%s, instr(%s, '|') + 1) as integer) as n, "
        "lag(cast(substr(%s, instr(%s, '|') + 1) as integer)) over (order by id) as before "
        "from %s) where n <= before";
    const auto query = [&](const std::string& column, const std::string& table) {
        std::string sql = outOfOrder;
        for (std::size_t at; (at = sql.find("%s")) != std::string::npos;)
            sql.replace(at, 2, sql.find("%s", at + 2) == std::string::npos ? table : column);
        return sql;
    };
    EXPECT_EQ(service.Count(service.DatabaseFile(), query("eventID", "OperLog")), 0);
    EXPECT_EQ(service.Count(service.OutboxFile(), query("event_id", "event")), 0);
}
