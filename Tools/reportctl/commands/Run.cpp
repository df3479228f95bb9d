#include <CLI/CLI.hpp>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/service/Turn.h"

namespace reportctl::commands {

void AddRun(CLI::App& app, int& exitCode) {
    auto* run = app.add_subcommand(
        "run",
        "Become the service as soon as no other one runs on this machine. One service runs on a machine, and "
        "SyncServiceReport itself ends at once with exit code 1 when another user's runs; this waits until "
        "that one has ended. For service managers.");
    run->footer(
        "Example:\n"
        "  reportctl setup --quiet && exec reportctl run\n"
        "\n"
        "Exit codes: those of the service, because this process becomes it: 0 it ended, also by a crash; 1 "
        "it refused to\n"
        "start, and its log says why. Also 1: the service's program could not be run. 100 and above: the "
        "command line\n"
        "was not understood.");
    run->callback([&exitCode] { exitCode = service::TakeTurn(); });
}

} // namespace reportctl::commands
