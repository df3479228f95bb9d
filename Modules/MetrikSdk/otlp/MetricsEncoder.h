#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/MetrikSdk/Time.h"
#include "Modules/MetrikSdk/otlp/ResourceConfig.h"

namespace MetrikSdk::otlp {

/// A figure under one set of attributes.
struct MetricPoint {
    std::vector<std::pair<std::string, std::string>> attributes;
    std::variant<std::int64_t, double> value;
};

/// A figure of this moment.
struct Metric {
    std::string name;
    std::string description; ///< For people.
    std::string unit;        ///< By UCUM, such as "By"; a count of things is in braces, such as "{report}".
    /// Since when it counts, 0 when that is not known: a sum that only grows, until a later start tells that
    /// it began again. Nothing: a gauge.
    std::optional<WallTime> countsSince;
    std::vector<MetricPoint> points;
};

/// Who reports, and when.
struct MetricsSender {
    std::string installation; ///< The UUID that log records have as metrik.outbox.id.
    ModuleIdentity program;
    WallTime now;
};

/// The metrics as the body of an OTLP/HTTP JSON metrics request: one resource, cumulative sums and gauges.
/// Pure. What is not UTF-8 is replaced by U+FFFD.
std::string EncodeMetrics(const std::vector<Metric>& metrics, const MetricsSender& sender,
                          const ResourceConfig& config = {});

} // namespace MetrikSdk::otlp
