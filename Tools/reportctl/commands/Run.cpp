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
    run->footer("Example:\n"
                "  reportctl setup --quiet && exec reportctl run\n"
                "\n" +
                app.get_footer());
    run->callback([&exitCode] { exitCode = service::TakeTurn(); });
}

} // namespace reportctl::commands
