// Sends numbered reports over UDP, at a given rate or as fast as the kernel takes them, and prints what it
// did as JSON. It does the same for each receiver: the service, the bare loop, another daemon.

#include <chrono>
#include <cstring>
#include <iostream>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <arpa/inet.h>
#include <fmt/format.h>
#include <netinet/in.h>
#include <sys/prctl.h>
#include <sys/socket.h>

#include "Common/Wire.h"
#include "bench/load/Clocks.h"
#include "bench/load/NumberedReport.h"

namespace {

struct Plan {
    std::int64_t count = 0;
    double perSecond = 0; ///< 0: as fast as possible
    std::string eventId = "B100|10001";
    std::string stampsFile; ///< gets the time before each send; empty for none
};

/// The shortest time between two wake-ups: a wake-up takes longer than a send. At 400,000 reports a second,
/// each wake-up therefore sends a burst of 100 reports, a hundredth of what the socket's largest buffer
/// holds.
constexpr std::int64_t TICK_NS = 250'000;

/// How much delay the sender makes up for. To make up for more would send a burst, which the fixed rate is
/// there to prevent. A longer delay makes the run longer instead, and the reported rate lower.
constexpr std::int64_t CATCH_UP_NS = 5'000'000;

class Sender {
public:
    explicit Sender(const Plan& plan) : m_plan(plan), m_report(plan.eventId) {
        m_service.sin_family = AF_INET;
        m_service.sin_port = htons(Wire::PORT);
        m_service.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        // This also touches the memory, before the clock runs.
        if (!plan.stampsFile.empty())
            m_stamps.resize(static_cast<std::size_t>(plan.count));
    }

    void SendAll() {
        if (m_plan.perSecond <= 0)
            return SendUntil(m_plan.count);
        std::int64_t begin = MonotonicNs();
        while (m_sent < m_plan.count) {
            const std::int64_t now = MonotonicNs();
            begin = std::max(begin, now - CATCH_UP_NS - DueAfter(m_sent));
            const auto due =
                static_cast<std::int64_t>(static_cast<double>(now - begin) / 1e9 * m_plan.perSecond);
            SendUntil(std::min(due + 1, m_plan.count));
            SleepUntil(std::max(begin + DueAfter(m_sent), now + TICK_NS));
        }
    }

    std::int64_t Sent() const { return m_sent; }
    std::int64_t Failed() const { return m_failed; }
    const std::vector<std::int64_t>& Stamps() const { return m_stamps; }

private:
    /// When the report with this number is due, counted from the first one.
    std::int64_t DueAfter(std::int64_t number) const {
        return static_cast<std::int64_t>(static_cast<double>(number) / m_plan.perSecond * 1e9);
    }

    void SendUntil(std::int64_t end) {
        for (; m_sent < end; ++m_sent) {
            const std::string& text = m_report.Text(m_sent);
            if (!m_stamps.empty())
                m_stamps[static_cast<std::size_t>(m_sent)] = MonotonicNs();
            const auto* address = reinterpret_cast<const sockaddr*>(&m_service);
            if (::sendto(m_socket, text.data(), text.size(), 0, address, sizeof m_service) < 0)
                ++m_failed;
        }
    }

    const Plan& m_plan;
    NumberedReport m_report;
    sockaddr_in m_service{};
    int m_socket = ::socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0); ///< open until the program ends
    std::vector<std::int64_t> m_stamps;
    std::int64_t m_sent = 0;
    std::int64_t m_failed = 0;
};

Plan PlanFrom(CLI::App& app, int argc, char** argv) {
    Plan plan;
    app.add_option("--count", plan.count, "How many reports")->required();
    app.add_option("--rate", plan.perSecond, "Reports a second; 0, the default, is as fast as it goes");
    app.add_option("--event", plan.eventId, "Event id; one that begins with A goes to analytics");
    app.add_option("--stamps", plan.stampsFile, "File for the time (CLOCK_MONOTONIC, ns) of each send");
    app.parse(argc, argv);
    return plan;
}

} // namespace

int main(int argc, char** argv) {
    CLI::App app("Sends numbered reports of 180 bytes to 127.0.0.1:9997.", "bench_sender");
    Plan plan;
    try {
        plan = PlanFrom(app, argc, argv);
    } catch (const CLI::ParseError& error) {
        return app.exit(error);
    }
    ::prctl(PR_SET_TIMERSLACK, 1UL); // so that sleeps end on time
    Sender sender(plan);
    const std::int64_t wallBegin = NowNs(CLOCK_REALTIME);
    const std::int64_t begin = MonotonicNs();
    sender.SendAll();
    const std::int64_t end = MonotonicNs();
    WriteStamps(plan.stampsFile, sender.Stamps());
    std::cout << fmt::format(R"({{"sent":{},"failed":{},"seconds":{:.6f},"begin_unix_ns":{},"cpu_ns":{}}})",
                             sender.Sent() - sender.Failed(), sender.Failed(),
                             static_cast<double>(end - begin) / 1e9, wallBegin,
                             NowNs(CLOCK_PROCESS_CPUTIME_ID))
              << std::endl;
    return 0;
}
