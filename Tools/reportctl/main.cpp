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

    // We do not use the caller's umask: only its owner may use a file or directory from the moment it exists.
    // Where others may use it, its mode is changed afterwards.
    ::umask(0077);

    try {
        return reportctl::terminal::FinishOutput(Run(argc, argv));
    } catch (const std::system_error& error) {
        if (error.code() == std::errc::broken_pipe) // the reader of a long output has read enough
            return 0;
        reportctl::terminal::TellLastError(error.what());
        return 1;
    } catch (const std::exception& error) { // for example, the disk became full during a long output
        reportctl::terminal::TellLastError(error.what());
        return 1;
    }
}
