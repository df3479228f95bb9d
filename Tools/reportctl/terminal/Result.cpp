#include "Tools/reportctl/terminal/Result.h"

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace reportctl::terminal {
namespace {

constexpr std::size_t BUFFER_BYTES = std::size_t{256} * 1024;

[[noreturn]] void Throw(const std::string& what) {
    throw std::system_error(errno, std::generic_category(), what);
}

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
    const int directory = ::open(DirectoryOf(path).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (directory < 0)
        return; // this user may not read the directory; the file's contents are on the disk
    ::fsync(directory);
    ::close(directory);
}

} // namespace

Result::Result(const std::string& path, mode_t mode)
    : m_path(path == "-" ? std::string() : path), m_mode(mode) {
    m_buffer.reserve(BUFFER_BYTES);
    if (IsStandardOutput())
        m_descriptor = STDOUT_FILENO;
    else
        OpenFile();
}

void Result::OpenFile() {
    if (IsSpecialFile(m_path)) {
        m_descriptor = ::open(m_path.c_str(), O_WRONLY | O_CLOEXEC | O_NOCTTY);
    } else {
        m_draft = m_path + ".new-XXXXXX";
        m_descriptor = ::mkostemp(m_draft.data(), O_CLOEXEC); // makes it with mode 0600
    }
    if (m_descriptor >= 0)
        return;
    m_draft.clear();
    Throw("cannot write " + m_path);
}

Result::~Result() {
    if (!IsStandardOutput())
        ::close(m_descriptor);
    if (!m_draft.empty())
        ::unlink(m_draft.c_str());
}

void Result::Write(std::string_view text) {
    m_buffer += text;
    if (m_buffer.size() >= BUFFER_BYTES)
        Flush();
}

void Result::Flush() {
    std::string_view rest = m_buffer;
    while (!rest.empty()) {
        const auto written = ::write(m_descriptor, rest.data(), rest.size());
        if (written < 0 && errno == EPIPE)
            EndByTheClosedPipe();
        if (written < 0 && errno != EINTR)
            Throw("cannot write " + (IsStandardOutput() ? "to standard output" : m_path));
        if (written > 0)
            rest.remove_prefix(static_cast<std::size_t>(written));
    }
    m_buffer.clear();
}

void Result::Finish() {
    Flush();
    if (m_draft.empty())
        return;
    if (::fchmod(m_descriptor, m_mode) != 0 || ::fsync(m_descriptor) != 0 ||
        ::rename(m_draft.c_str(), m_path.c_str()) != 0)
        Throw("cannot write " + m_path);
    m_draft.clear();
    SyncDirectoryOf(m_path);
}

} // namespace reportctl::terminal
