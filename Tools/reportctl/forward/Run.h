#pragma once

#include <chrono>
#include <functional>
#include <string>

#include "Tools/reportctl/forward/Collector.h"
#include "Tools/reportctl/forward/Forwarder.h"
#include "Tools/reportctl/forward/State.h"
#include "Tools/reportctl/forward/Teller.h"

namespace reportctl::forward {

/// What a run is about.
struct Task {
    std::string store;
    std::string state;
    std::string outbox;
    bool isOnce = false; ///< Send what waits, and end.
    bool withMetrics = false;
};

/// How a run ended.
struct Result {
    Forwarder::Counts rows; ///< Of this run.
    Totals totals;          ///< Of all runs.
    bool isComplete = true; ///< All that there was to send was sent. A run without an end has no other end.
    std::string failure;    ///< Why not.
    std::string metricsFailure;
};

/// What a dry run found.
struct Plan {
    Extent ahead;
    bool wasBegun = false; ///< Rows were sent before.
};

/// What would be sent. Changes nothing, and makes nothing.
Plan PlanRun(const Task& task);

/// Sends the store's new rows, and the figures: at the end of a run with an end, else at the beginning and
/// each minute. `collector` has what it needs.
///
/// Returns at the end of a run with an end, or after Ctrl-C or SIGTERM, which also ends a request under way.
/// The calling thread must be the only one. Failure: as State; an error of the store or the collector is
/// given to `teller`, waited for, and in the result.
Result Run(const Task& task, const Collector& collector, Teller& teller);

/// For a run with an end: shorter waits, because a timer starts the next one.
MetrikSdk::OutboxSettings SettingsFor(const Task& task, const Collector& collector);

} // namespace reportctl::forward
