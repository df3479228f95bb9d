#include <iomanip>
#include <sstream>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/Modules/MetrikSdk/support/LoopbackServer.h"
#include "tests/e2e/support/Service.h"
#include "tests/e2e/support/SteppedClock.h"
#include "tests/support/WaitUntil.h"

using ::testing::ElementsAre;

// When the wall clock jumps, only the times change that are written down.

namespace {

using namespace std::chrono_literals;

class ClockFault : public ::testing::Test {
protected:
    ClockFault() {
        m_service.SetEnvironment("OTEL_EXPORTER_OTLP_ENDPOINT=" + m_collector.Url());
        m_service.Install();
        m_service.Start();
    }

    /// Expects that all reports are stored and all events delivered, and as quickly as usual.
    void ExpectEverythingToGoOn() {
        for (int i = 0; i < 20; ++i) {
            Service::Send(R"({"eventID":"B1"})");
            Service::Send(R"({"eventID":"A759|1"})");
        }
        m_sent += 20;
        m_service.AwaitQuiet();
        EXPECT_EQ(m_service.RowCount(), m_sent);
        const auto all = std::to_string(m_sent);
        EXPECT_TRUE(WaitUntil([&] { return Outbox() == std::vector{all + "|" + all + "|0"}; }, 20s));
        EXPECT_THAT(Outbox(), ElementsAre(all + "|" + all + "|0")) << "stored, delivered, dropped";
    }

    /// Expects that the last line of the log has the time of the service's clock, which is `ahead`.
    void ExpectTheLogToBeAhead(std::chrono::seconds ahead) const {
        const std::string log = m_service.Log();
        std::istringstream line(log.substr(log.rfind('\n', log.size() - 2) + 1));
        std::tm local{};
        line >> std::get_time(&local, "%Y-%m-%d %H:%M:%S");
        local.tm_isdst = -1; // mktime decides whether it is summer time
        const auto written = std::chrono::system_clock::from_time_t(std::mktime(&local));
        EXPECT_LT(std::chrono::abs(written - (std::chrono::system_clock::now() + ahead)), 1min) << line.str();
    }

    std::vector<std::string> Outbox() const {
        return m_service.Query(m_service.OutboxFile(),
                               "select stored, delivered, dropped from outbox_status");
    }

    std::int64_t Stored() const {
        return m_service.Count(m_service.OutboxFile(), "select stored from outbox_status");
    }

    Service m_service;
    const SteppedClock m_clock{m_service};
    const LoopbackServer m_collector{[](const Request&) { return Reply(); }};
    int m_sent = 0;
};

} // namespace

TEST_F(ClockFault, AYearForwardsAndBackChangesNothingButTheTimes) {
    ExpectEverythingToGoOn();
    m_clock.StepTo(24h * 365);
    ExpectEverythingToGoOn();
    ExpectTheLogToBeAhead(24h * 365);
    m_clock.StepTo(0s);
    ExpectEverythingToGoOn();
    ExpectTheLogToBeAhead(0h);
}

TEST_F(ClockFault, AnHourBackwardsChangesNothingButTheTimes) {
    ExpectEverythingToGoOn();
    m_clock.StepTo(-1h);
    ExpectEverythingToGoOn();
    ExpectTheLogToBeAhead(-1h);
}

TEST_F(ClockFault, EventsThatWaitWhileItStepsAreDeliveredAtOnce) {
    ExpectEverythingToGoOn();
    // The uploader waits a second for more events. So most of these jumps happen while events wait.
    for (const auto ahead : {24h * 365, -1h, 0h}) {
        Service::Send(R"({"eventID":"A759|1"})");
        Service::Send(R"({"eventID":"B1"})");
        ++m_sent;
        EXPECT_TRUE(WaitUntil([&] { return Stored() == m_sent; }));
        m_clock.StepTo(ahead);
        ExpectEverythingToGoOn();
    }
}
