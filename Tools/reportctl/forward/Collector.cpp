#include "Tools/reportctl/forward/Collector.h"

#include <algorithm>

namespace reportctl::forward {
namespace {

using MetrikSdk::otlp::Signal;

bool NamesAnEndpoint(const service::Environment& environment) {
    const auto names = {"OTEL_EXPORTER_OTLP_ENDPOINT", "OTEL_EXPORTER_OTLP_LOGS_ENDPOINT",
                        "OTEL_EXPORTER_OTLP_METRICS_ENDPOINT"};
    return std::any_of(names.begin(), names.end(),
                       [&](const char* name) { return environment.Find(name) != nullptr; });
}

/// Both signals complain of a variable that they share.
void RemoveRepetitions(std::vector<std::string>& complaints) {
    std::vector<std::string> once;
    for (auto& complaint : complaints)
        if (std::find(once.begin(), once.end(), complaint) == once.end())
            once.push_back(std::move(complaint));
    complaints = std::move(once);
}

} // namespace

service::Environment EnvironmentToUse() {
    auto own = service::Own();
    return NamesAnEndpoint(own) ? own : service::OfTheService();
}

Collector CollectorOf(const service::Environment& environment) {
    const auto lookUp = [&](const char* name) { return environment.Find(name); };
    Collector collector;
    collector.logs = MetrikSdk::otlp::ReadEndpoint(lookUp, collector.complaints, Signal::Logs);
    collector.metrics = MetrikSdk::otlp::ReadEndpoint(lookUp, collector.complaints, Signal::Metrics);
    collector.disabledBy = MetrikSdk::otlp::DisabledBy(lookUp, Signal::Logs);
    collector.resource = MetrikSdk::otlp::ReadResource(lookUp, collector.complaints);
    RemoveRepetitions(collector.complaints);
    return collector;
}

} // namespace reportctl::forward
