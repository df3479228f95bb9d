#include <memory>
#include <string>

#include <CLI/CLI.hpp>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/status/Status.h"
#include "Tools/reportctl/terminal/Result.h"

namespace reportctl::commands {
namespace {

/// All users may read the file, because a monitoring system runs as another user.
constexpr mode_t READABLE = 0644;

constexpr auto HELP = "Examples:\n"
                      "  reportctl metrics\n"
                      "  reportctl metrics --output /var/lib/prometheus/node-exporter/hublink-report.prom\n"
                      "\n";

} // namespace

void AddMetrics(CLI::App& app, int& exitCode) {
    auto* metrics =
        app.add_subcommand("metrics", "Write what status shows as figures for a monitoring "
                                      "system, in Prometheus's text format. The exit code "
                                      "is 0 when they were written, also when they show a fault.");
    auto file = std::make_shared<std::string>();
    metrics
        ->add_option(
            "--output", *file,
            "Write them to FILE, readable for all users: the whole of it or, on a failure, none of it.")
        ->type_name("FILE");
    metrics->footer(HELP + app.get_footer());
    metrics->callback([file, &exitCode] {
        const auto status = status::Gather();
        terminal::Result result(*file, READABLE);
        result.Write(MetricsOf(status, Judge(status)));
        result.Finish();
        exitCode = 0;
    });
}

} // namespace reportctl::commands
