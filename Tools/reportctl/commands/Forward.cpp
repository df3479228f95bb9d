#include <cstdio>
#include <memory>
#include <stdexcept>
#include <string>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/forward/Collector.h"
#include "Tools/reportctl/forward/Run.h"
#include "Tools/reportctl/store/Paths.h"
#include "Tools/reportctl/terminal/Json.h"
#include "Tools/reportctl/terminal/Output.h"
#include "Tools/reportctl/terminal/Printable.h"

namespace reportctl::commands {
namespace {

using forward::Collector;

constexpr auto HELP =
    "Examples:\n"
    "  reportctl forward --dry-run                       # says what would be sent\n"
    "  reportctl forward --once                          # sends what is new, and ends; for timers\n"
    "  reportctl forward --metrics                       # goes on until Ctrl-C; sends the service's "
    "figures, too\n"
    "\n"
    "The collector is the one of the analytics plug-in: OTEL_EXPORTER_OTLP_ENDPOINT and its family, from "
    "this\n"
    "environment or, when that names no endpoint, from the running service's. How far it got is kept in\n"
    "hublink/forward/Forward.db of the user's data directory; the store is only read. A row may be sent "
    "twice, "
    "under\n"
    "the same log.record.uid. The first run sends the whole store.\n"
    "\n"
    "Exit codes: 0 everything was sent, or there was nothing to send; 1 something was not, and the message "
    "says\n"
    "what. 100 and above: the command line was not understood.\n";

struct ForwardOptions {
    bool isDryRun = false;
    bool isOnce = false;
    bool withMetrics = false;
    bool isJson = false;
};

forward::Task TaskOf(const ForwardOptions& options) {
    return {store::StorePath(), store::ForwardPath(), store::OutboxPath(), options.isOnce,
            options.withMetrics};
}

std::string DestinationOf(const std::optional<MetrikSdk::otlp::EndpointConfig>& endpoint) {
    return endpoint ? MetrikSdk::otlp::WithoutSecrets(endpoint->url) : "";
}

std::string Rows(std::int64_t count) {
    return count == 1 ? "1 row" : fmt::format("{} rows", count);
}

/// What is asked for and has nowhere to go; empty when all is well.
std::string MissingIn(const Collector& collector, const ForwardOptions& options) {
    if (!collector.disabledBy.empty())
        return "sending is switched off by " + collector.disabledBy;
    if (!collector.logs)
        return "no collector is configured: set OTEL_EXPORTER_OTLP_ENDPOINT";
    if (options.withMetrics && !collector.metrics)
        return "no collector for metrics is configured (OTEL_METRICS_EXPORTER is none, or only "
               "OTEL_EXPORTER_OTLP_LOGS_ENDPOINT is set)";
    return {};
}

std::string RowsAhead(const forward::Extent& ahead) {
    return ahead.rows == 1 ? fmt::format("1 row (id {})", ahead.first)
                           : fmt::format("{} rows (ids {} to {})", ahead.rows, ahead.first, ahead.last);
}

void TellPlan(const forward::Plan& plan, const Collector& collector, const ForwardOptions& options) {
    const auto to = collector.logs ? " to " + DestinationOf(collector.logs) : "";
    if (plan.ahead.rows == 0)
        fmt::print("There is nothing to send{}.\n", to);
    else
        fmt::print("Would send {} of {}{}.\n", RowsAhead(plan.ahead), store::StorePath(), to);
    if (options.withMetrics && collector.metrics)
        fmt::print("Would send the service's figures to {}.\n", DestinationOf(collector.metrics));
    fmt::print("Nothing was sent.\n");
}

void PrintPlan(const forward::Plan& plan, const Collector& collector) {
    terminal::JsonObject json;
    json.AddBool("dryRun", true);
    json.AddOrNull("destination", DestinationOf(collector.logs));
    json.Add("rows", plan.ahead.rows);
    json.Add("firstRow", plan.ahead.first);
    json.Add("lastRow", plan.ahead.last);
    fmt::print("{}\n", json.Take());
}

int Plan(const Collector& collector, const ForwardOptions& options) {
    const auto plan = forward::PlanRun(TaskOf(options));
    if (options.isJson)
        PrintPlan(plan, collector);
    else
        TellPlan(plan, collector, options);
    terminal::FlushOutput();
    const auto missing = MissingIn(collector, options);
    if (!missing.empty())
        terminal::TellLastError(missing);
    return missing.empty() ? 0 : 1;
}

/// Errors are not repeated here: each was printed when it happened.
void TellResult(const forward::Result& result, const Collector& collector, bool isWithMetrics) {
    fmt::print("{} sent to {}.\n", Rows(result.rows.sent), DestinationOf(collector.logs));
    if (result.rows.refused > 0)
        fmt::print("{} will not be sent; why: sqlite3 {} 'select * from refused'\n",
                   Rows(result.rows.refused), store::ForwardPath());
    if (isWithMetrics && result.metricsFailure.empty())
        fmt::print("The service's figures were sent to {}.\n", DestinationOf(collector.metrics));
    if (result.totals.held > 0)
        fmt::print(
            "{} held, which the collector does not take while it takes others. Each run tries again.\n",
            Rows(result.totals.held));
    terminal::FlushOutput();
    if (!result.isComplete)
        terminal::TellLastError("not everything was sent; the next run goes on where this one ended");
    if (!result.metricsFailure.empty())
        terminal::TellLastError("the figures were not sent");
}

void PrintResult(const forward::Result& result, const Collector& collector) {
    terminal::JsonObject json;
    json.AddBool("dryRun", false);
    json.AddOrNull("destination", DestinationOf(collector.logs));
    json.Add("sent", result.rows.sent);
    json.Add("refused", result.rows.refused);
    json.Add("held", result.totals.held);
    json.Add("sentEver", result.totals.forwarded);
    json.Add("refusedEver", result.totals.refused);
    json.AddBool("complete", result.isComplete);
    json.AddOrNull("failure", result.failure);
    json.AddOrNull("metricsFailure", result.metricsFailure);
    fmt::print("{}\n", json.Take());
}

bool IsAllWell(const forward::Result& result) {
    return result.isComplete && result.rows.refused == 0 && result.totals.held == 0 &&
           result.metricsFailure.empty();
}

int Send(const Collector& collector, const ForwardOptions& options) {
    forward::Teller teller(
        [](const std::string& line) { fmt::print(stderr, "{}\n", terminal::Printable(line)); });
    if (!options.isOnce && !options.isJson)
        fmt::print(stderr, "Sending new rows of {} to {} every 30 seconds; Ctrl-C ends it.\n",
                   store::StorePath(), DestinationOf(collector.logs));
    const auto result = forward::Run(TaskOf(options), collector, teller);
    if (options.isJson)
        PrintResult(result, collector);
    else
        TellResult(result, collector, options.withMetrics);
    return !options.isOnce || IsAllWell(result) ? 0 : 1;
}

int RunForward(const ForwardOptions& options) {
    const auto environment = forward::EnvironmentToUse();
    const auto collector = forward::CollectorOf(environment);
    for (const auto& complaint : collector.complaints)
        fmt::print(stderr, "warning: {}\n", terminal::Printable(complaint));
    if (options.isDryRun)
        return Plan(collector, options);
    if (const auto missing = MissingIn(collector, options); !missing.empty())
        throw std::runtime_error(missing + "; nothing was sent");
    service::TakeOverProxies(environment);
    return Send(collector, options);
}

} // namespace

void AddForward(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<ForwardOptions>();
    auto* command = app.add_subcommand(
        "forward",
        "Send the store's new rows to the collector that events for analytics go to, as log records of "
        "OpenTelemetry's protocol, until Ctrl-C. It remembers how far it got.");
    command->add_flag("--dry-run", options->isDryRun, "Say what would be sent, and send nothing");
    command->add_flag("--once", options->isOnce,
                      "Send what is new, and end. While the collector does not take it, try for up to a "
                      "minute; then end with exit code 1");
    command->add_flag("--metrics", options->withMetrics,
                      "Send the service's figures as metrics, too: at the start, and each minute");
    command->add_flag("--json", options->isJson, "Tell the result as a JSON object");
    command->footer(HELP);
    command->callback([options, &exitCode] { exitCode = RunForward(*options); });
}

} // namespace reportctl::commands
