#include <exception>
#include <system_error>

#include <CLI/CLI.hpp>
#include <sys/stat.h>

#include "SystemTool/IO/StandardDescriptors.h"
#include "Tools/reportctl/commands/CommandLine.h"
#include "Tools/reportctl/terminal/Output.h"

namespace {

int Run(int argc, char** argv) {
    int exitCode = 0;
    const auto app = reportctl::commands::MakeCommandLine(exitCode);
    CLI11_PARSE(*app, argc, argv);
    return exitCode;
}

} // namespace

int main(int argc, char** argv) {
    SystemTool::IO::OpenClosedStandardDescriptors();

    // The caller's mask does not count: a file or directory is its owner's alone from the moment it exists,
    // and is opened to others afterwards where that is meant.
    ::umask(0077);

    try {
        return reportctl::terminal::FinishOutput(Run(argc, argv));
    } catch (const std::system_error& error) {
        if (error.code() == std::errc::broken_pipe) // the reader of a long output has seen enough
            return 0;
        reportctl::terminal::TellLastError(error.what());
        return 1;
    } catch (const std::exception& error) { // such as a disk that is full in the middle of a long output
        reportctl::terminal::TellLastError(error.what());
        return 1;
    }
}
