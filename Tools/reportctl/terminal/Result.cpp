#include "Tools/reportctl/terminal/Result.h"

#include <cerrno>
#include <csignal>
#include <cstdlib>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "SystemTool/Errno.h"

namespace reportctl::terminal {
namespace {

using SystemTool::IO::Descriptor;

constexpr std::size_t BUFFER_BYTES = std::size_t{256} * 1024;

bool IsSpecialFile(const std::string& path) {
    struct stat status {};
    return ::stat(path.c_str(), &status) == 0 && !S_ISREG(status.st_mode);
}

std::string DirectoryOf(const std::string& path) {
    const auto slash = path.rfind('/');
    return slash == std::string::npos ? "." : path.substr(0, slash + 1);
}

/// Ends the program as SIGPIPE does by default: the reader closed the pipe because it has read enough, which
/// is no failure. We raise the signal here, because a library that this program links sets it to be ignored.
[[noreturn]] void EndByTheClosedPipe() {
    std::signal(SIGPIPE, SIG_DFL);
    std::raise(SIGPIPE);
    std::_Exit(0); // reached when the signal is blocked
}

/// Puts a file's new name on the disk: after a crash, the name is there only when its directory was synced.
void SyncDirectoryOf(const std::string& path) {
    const Descriptor directory(::open(DirectoryOf(path).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (directory.IsOpen()) // else this user may not read the directory; the file's contents are on the disk
        ::fsync(directory.Number());
}

} // namespace

Result::Result(const std::string& path, mode_t mode)
    : m_path(path == "-" ? std::string() : path), m_mode(mode) {
    m_buffer.reserve(BUFFER_BYTES);
    if (!IsStandardOutput())
        OpenFile();
}

void Result::OpenFile() {
    if (IsSpecialFile(m_path)) {
        m_file = Descriptor(::open(m_path.c_str(), O_WRONLY | O_CLOEXEC | O_NOCTTY));
    } else {
        m_draft = m_path + ".new-XXXXXX";
        m_file = Descriptor(::mkostemp(m_draft.data(), O_CLOEXEC)); // makes it with mode 0600
    }
    if (m_file.IsOpen())
        return;
    m_draft.clear();
    SystemTool::ThrowErrno("cannot write " + m_path);
}

Result::~Result() {
    if (!m_draft.empty())
        ::unlink(m_draft.c_str());
}

void Result::Write(std::string_view text) {
    m_buffer += text;
    if (m_buffer.size() >= BUFFER_BYTES)
        Flush();
}

void Result::Flush() {
    const int output = IsStandardOutput() ? STDOUT_FILENO : m_file.Number();
    std::string_view rest = m_buffer;
    while (!rest.empty()) {
        const auto written = ::write(output, rest.data(), rest.size());
        if (written < 0 && errno == EPIPE)
            EndByTheClosedPipe();
        if (written < 0 && errno != EINTR)
            SystemTool::ThrowErrno("cannot write " + (IsStandardOutput() ? "to standard output" : m_path));
        if (written > 0)
            rest.remove_prefix(static_cast<std::size_t>(written));
    }
    m_buffer.clear();
}

void Result::Finish() {
    Flush();
    if (m_draft.empty())
        return;
    if (::fchmod(m_file.Number(), m_mode) != 0 || ::fsync(m_file.Number()) != 0 ||
        ::rename(m_draft.c_str(), m_path.c_str()) != 0)
        SystemTool::ThrowErrno("cannot write " + m_path);
    m_draft.clear();
    SyncDirectoryOf(m_path);
}

} // namespace reportctl::terminal
