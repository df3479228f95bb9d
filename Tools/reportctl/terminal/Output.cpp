#include "Tools/reportctl/terminal/Output.h"

#include <cerrno>
#include <cstdio>

#include "SystemTool/Errno.h"

namespace reportctl::terminal {

int FinishOutput(int exitCode) {
    const bool wasWritten = std::ferror(stdout) == 0;
    errno = 0;
    // This also writes what was printed with std::cout (the help), which has no buffer of its own.
    if (std::fflush(stdout) == 0 && wasWritten)
        return exitCode;
    if (errno == EPIPE)
        return exitCode; // the reader closed the pipe because it has read enough
    TellLastError("cannot write to standard output" +
                  (errno == 0 ? std::string() : ": " + SystemTool::ErrnoText(errno)));
    return exitCode == 0 ? 1 : exitCode;
}

void TellLastError(const std::string& text) {
    std::fputs(("error: " + text + "\n").c_str(), stderr);
}

} // namespace reportctl::terminal
