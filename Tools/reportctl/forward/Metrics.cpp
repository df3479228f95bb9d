#include "Tools/reportctl/forward/Metrics.h"

#include <chrono>
#include <vector>

#include "Modules/MetrikSdk/otlp/MetricsEncoder.h"
#include "Modules/MetrikSdk/upload/RetryPolicy.h"
#include "SystemTool/IO/JsonDocument.h"
#include "SystemTool/Version.h"
#include "Tools/reportctl/status/Figures.h"

namespace reportctl::forward {
namespace {

using MetrikSdk::WallTime;
using MetrikSdk::otlp::Metric;
namespace RetryPolicy = MetrikSdk::upload::RetryPolicy;

WallTime TimeOf(std::int64_t ms) {
    return WallTime(std::chrono::milliseconds(ms));
}

Metric MetricOf(const status::Figure& figure) {
    Metric metric{.name = "hublink.report." + figure.name,
                  .description = figure.help,
                  .unit = figure.unit,
                  .countsSince = {},
                  .points = {}};
    if (figure.isCounter)
        metric.countsSince = TimeOf(figure.countsSinceMs.value_or(0));
    for (const auto& sample : figure.samples) {
        auto& point = metric.points.emplace_back();
        point.value = sample.value;
        if (!sample.reason.empty())
            point.attributes.emplace_back("reason", sample.reason);
    }
    return metric;
}

/// A rejected point is one that the collector cannot use, now or later.
std::string RemarkIn(const std::string& answer) {
    SystemTool::IO::JsonDocument document;
    std::string error;
    document.FromJson(answer, error);
    const auto partial = document.GetKeyValue("partialSuccess");
    const auto rejected = partial.GetKeyValue("rejectedDataPoints").ToString();
    const auto message = partial.GetKeyValue("errorMessage").ToString();
    if (rejected.empty() || rejected == "0")
        return message.empty() ? "" : "the collector took the figures and says: " + message;
    return "the collector rejected " + rejected + " figures: " + message;
}

} // namespace

std::string MetricsBodyOf(const status::Status& status, const status::Judgement& judgement,
                          const std::string& installation, const MetrikSdk::otlp::ResourceConfig& resource) {
    std::vector<Metric> metrics;
    for (const auto& figure : status::FiguresOf(status, judgement))
        metrics.push_back(MetricOf(figure));
    return MetrikSdk::otlp::EncodeMetrics(
        metrics,
        {installation, {"store", SystemTool::Version::Number(), "SyncServiceReport"}, TimeOf(status.atMs)},
        resource);
}

MetricsOutcome SendMetrics(MetrikSdk::otlp::Sender& sender, const std::string& body, double random,
                           WallTime now) {
    const auto result = sender.Post(body);
    const auto wished = RetryPolicy::WishedWait(result, random, now, MetrikSdk::RetrySettings());
    if (RetryPolicy::Judge(result) == MetrikSdk::upload::Verdict::Delete)
        return {true, RemarkIn(result.body), wished};
    const auto lookAt = RetryPolicy::LookAt(result, sender.HeaderNames(), sender.Variables());
    return {false,
            sender.Destination() + ": " + RetryPolicy::Describe(result) +
                (lookAt.empty() ? "" : "; " + lookAt),
            wished};
}

} // namespace reportctl::forward
