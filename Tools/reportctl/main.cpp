#include <CLI/CLI.hpp>

#include <sys/stat.h>

#include "Tools/reportctl/commands/Commands.h"

int main(int argc, char** argv) {
    // Whatever the caller's mask says: a file or directory is its owner's alone from the moment it exists,
    // and is opened to others afterwards where that is meant.
    ::umask(0077);

    CLI::App app("Looks after SyncServiceReport, the service that stores usage reports.", "reportctl");
    app.require_subcommand(1);
    app.footer(
        "Exit codes: 0 done, or nothing to do; 1 something could not be done, and the message says what\n"
        "to do about it; 100 and above: the command line was not understood.");

    int exitCode = 0;
    for (auto* const add : reportctl::commands::ALL)
        add(app, exitCode);

    CLI11_PARSE(app, argc, argv);
    return exitCode;
}
