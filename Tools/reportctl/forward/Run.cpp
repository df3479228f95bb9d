#include "Tools/reportctl/forward/Run.h"

#include <algorithm>
#include <memory>
#include <random>

#include "Modules/MetrikSdk/otlp/HttpSender.h"
#include "Tools/reportctl/forward/EndOfRun.h"
#include "Tools/reportctl/forward/Metrics.h"
#include "Tools/reportctl/forward/Schedule.h"
#include "Tools/reportctl/forward/StopSignals.h"
#include "Tools/reportctl/status/Status.h"
#include "Tools/reportctl/store/Store.h"

namespace reportctl::forward {
namespace {

using MetrikSdk::WallNow;
using MetrikSdk::otlp::HttpSender;
using Clock = std::chrono::steady_clock;

/// What the variables' definition takes for the time between two exports of metrics.
constexpr auto BETWEEN_METRICS = std::chrono::minutes(1);

/// Uniform in [0, 1): a fleet must not come back together.
std::function<double()> Chance() {
    return [engine = std::make_shared<std::mt19937_64>(std::random_device{}())] {
        return std::uniform_real_distribution<double>()(*engine);
    };
}

/// Sends the figures.
class MetricsExport {
public:
    MetricsExport(HttpSender& sender, const State& state, const Collector& collector, Teller& teller)
        : m_sender(sender), m_state(state), m_collector(collector), m_teller(teller) {}

    /// Returns how long to wait before the next ones.
    std::chrono::milliseconds Send() {
        const auto status = status::Gather();
        const auto outcome = SendMetrics(
            m_sender,
            MetricsBodyOf(status, status::Judge(status), m_state.Where().installation, m_collector.resource),
            m_random(), WallNow());
        m_failure = outcome.isTaken ? "" : outcome.remark;
        if (!outcome.remark.empty())
            m_teller.Note(outcome.isTaken ? outcome.remark : "the figures were not taken: " + outcome.remark);
        return std::max<std::chrono::milliseconds>(BETWEEN_METRICS, outcome.wishedWait);
    }

    /// Why the last ones were not taken; empty when they were.
    const std::string& Failure() const { return m_failure; }

private:
    HttpSender& m_sender;
    const State& m_state;
    const Collector& m_collector;
    Teller& m_teller;
    std::function<double()> m_random = Chance();
    std::string m_failure;
};

/// The parts of one run.
class Running {
public:
    Running(const Task& task, const Collector& collector, Teller& teller)
        : m_task(task), m_settings(SettingsFor(task, collector)), m_state(task.state, task.outbox),
          m_reader(task.store, m_settings.caps.maxEventBytes), m_queue(m_reader, m_state, m_settings.batch),
          m_rowSender(*collector.logs), m_forwarder(m_queue, m_rowSender, teller, m_settings, Chance()) {
        if (!task.withMetrics)
            return;
        m_metricsSender = std::make_unique<HttpSender>(*collector.metrics);
        m_metrics = std::make_unique<MetricsExport>(*m_metricsSender, m_state, collector, teller);
    }

    Result Go() {
        StopSignals stop([this] { Abandon(); });
        Result result;
        if (m_task.isOnce)
            GoOnce(stop, result);
        else
            GoOn(stop);
        result.rows = m_forwarder.Done();
        result.totals = m_state.Sums();
        result.metricsFailure = m_metrics ? m_metrics->Failure() : "";
        return result;
    }

private:
    void Abandon() {
        m_rowSender.Abandon();
        if (m_metricsSender)
            m_metricsSender->Abandon();
    }

    void GoOnce(StopSignals& stop, Result& result) {
        EndOfRun end(WallNow());
        for (;;) {
            const auto step = m_forwarder.Pass(WallNow());
            if (end.IsOver(step, WallNow()))
                break;
            if (!stop.Wait(step.pause)) {
                result.isComplete = false;
                result.failure = "it was told to end";
                break;
            }
        }
        m_forwarder.EndRun();
        if (m_metrics) // now it is known whether the collector is there
            m_metrics->Send();
        if (end.HasFailed()) {
            result.isComplete = false;
            result.failure = m_forwarder.LastFailure();
        }
    }

    void GoOn(StopSignals& stop) {
        Schedule schedule(m_metrics != nullptr);
        do {
            if (schedule.FiguresAreDue(Clock::now())) {
                const auto pause = m_metrics->Send();
                schedule.FiguresWait(Clock::now(), pause);
            }
            if (schedule.RowsAreDue(Clock::now())) {
                const auto pause = m_forwarder.Pass(WallNow()).pause;
                schedule.RowsWait(Clock::now(), pause);
            }
        } while (stop.Wait(schedule.UntilDue(Clock::now())));
    }

    const Task& m_task;
    const MetrikSdk::OutboxSettings m_settings;
    State m_state;
    StoreReader m_reader;
    RowQueue m_queue;
    HttpSender m_rowSender;
    Forwarder m_forwarder;
    std::unique_ptr<HttpSender> m_metricsSender;
    std::unique_ptr<MetricsExport> m_metrics;
};

} // namespace

MetrikSdk::OutboxSettings SettingsFor(const Task& task, const Collector& collector) {
    MetrikSdk::OutboxSettings settings;
    settings.resource = collector.resource;
    if (task.isOnce)
        settings.retry.maxWait = std::chrono::seconds(2);
    return settings;
}

Plan PlanRun(const Task& task) {
    store::RequireStore(
        task.store); // what it says is more use than what the state says of the same directory
    const auto place = State::LookAt(task.state);
    const StoreReader reader(task.store, MetrikSdk::CapSettings().maxEventBytes);
    return {reader.Ahead(place), place.position != Place::BEGINNING};
}

Result Run(const Task& task, const Collector& collector, Teller& teller) {
    return Running(task, collector, teller).Go();
}

} // namespace reportctl::forward
