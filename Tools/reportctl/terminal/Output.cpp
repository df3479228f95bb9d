#include "Tools/reportctl/terminal/Output.h"

#include <cerrno>
#include <cstdio>

#include "SystemTool/Errno.h"

namespace reportctl::terminal {
namespace {

int g_flushError = 0; ///< The errno of the first flush that failed, which the stream itself does not keep.

} // namespace

void FlushOutput() {
    if (std::fflush(stdout) != 0 && g_flushError == 0)
        g_flushError = errno;
}

int FinishOutput(int exitCode) {
    const bool wasWritten = std::ferror(stdout) == 0;
    FlushOutput(); // also writes what was printed with std::cout (the help), which has no buffer of its own
    if (wasWritten && g_flushError == 0)
        return exitCode;
    if (g_flushError == EPIPE)
        return exitCode; // the reader closed the pipe because it has read enough
    TellLastError("cannot write to standard output" +
                  (g_flushError == 0 ? std::string() : ": " + SystemTool::ErrnoText(g_flushError)));
    return exitCode == 0 ? 1 : exitCode;
}

void TellLastError(const std::string& text) {
    std::fputs(("error: " + text + "\n").c_str(), stderr);
}

} // namespace reportctl::terminal
