#include "Tools/reportctl/commands/CommandLine.h"

#include <algorithm>

#include <CLI/CLI.hpp>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/commands/Help.h"
#include "Tools/reportctl/service/Program.h"
#include "Tools/reportctl/terminal/Columns.h"

namespace reportctl::commands {
namespace {

constexpr std::size_t WIDEST_HELP = 110; // longer lines are hard to read

} // namespace

std::unique_ptr<CLI::App> MakeCommandLine(int& exitCode) {
    auto app = std::make_unique<CLI::App>(
        "Looks after SyncServiceReport, the service that stores usage reports.", "reportctl");
    app->formatter(std::make_shared<Help>(std::min(terminal::Columns(), WIDEST_HELP)));
    app->require_subcommand(1);
    app->footer(
        "Exit codes: 0 done, or nothing to do; 1 something could not be done, and the message says what\n"
        "to do about it; 100 and above: the command line was not understood.");
    app->set_version_flag("--version", service::VersionText,
                          "Print the version and build of reportctl and of the service, and exit");
    for (auto* const add : ALL)
        add(*app, exitCode);
    return app;
}

} // namespace reportctl::commands
