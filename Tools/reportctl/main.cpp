#include <CLI/CLI.hpp>

#include <sys/stat.h>

#include "Tools/reportctl/commands/CommandLine.h"

int main(int argc, char** argv) {
    // Whatever the caller's mask says: a file or directory is its owner's alone from the moment it exists,
    // and is opened to others afterwards where that is meant.
    ::umask(0077);

    int exitCode = 0;
    const auto app = reportctl::commands::MakeCommandLine(exitCode);
    CLI11_PARSE(*app, argc, argv);
    return exitCode;
}
