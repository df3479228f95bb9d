#pragma once

#include <chrono>
#include <string>

#include "Modules/MetrikSdk/Time.h"
#include "Modules/MetrikSdk/otlp/ResourceConfig.h"
#include "Modules/MetrikSdk/otlp/Sender.h"
#include "Tools/reportctl/status/Status.h"

/// The figures of `reportctl metrics` for a collector.
namespace reportctl::forward {

/// The body of a request. A figure's name is that of `reportctl metrics` with dots, "hublink.report.received"
/// for hublink_report_received_total: a collector that writes for Prometheus makes the same names of them.
/// Pure.
std::string MetricsBodyOf(const status::Status& status, const status::Judgement& judgement,
                          const std::string& installation, const MetrikSdk::otlp::ResourceConfig& resource);

struct MetricsOutcome {
    bool isTaken = false;
    std::string remark;                      ///< Why not; or what the collector says all the same.
    std::chrono::milliseconds wishedWait{0}; ///< The collector wants no figures before.
};

/// Sends one body. It is not repeated: the next body says everything that this one said. `random` is uniform
/// in [0, 1).
MetricsOutcome SendMetrics(MetrikSdk::otlp::Sender& sender, const std::string& body, double random,
                           MetrikSdk::WallTime now);

} // namespace reportctl::forward
