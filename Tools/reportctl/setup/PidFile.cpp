#include "Tools/reportctl/setup/PidFile.h"

#include <cerrno>
#include <stdexcept>
#include <system_error>

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Tools/reportctl/terminal/ShellQuoted.h"

namespace reportctl::setup {
namespace {

constexpr auto NAME = "Report.pid";
constexpr mode_t MODE = 0666;

[[noreturn]] void ThrowErrno(int code) {
    throw std::runtime_error(std::generic_category().message(code));
}

/// A descriptor that is closed at the end.
class Descriptor {
public:
    explicit Descriptor(int descriptor) : m_descriptor(descriptor) {
        if (descriptor < 0)
            ThrowErrno(errno);
    }
    ~Descriptor() { ::close(m_descriptor); }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;

    int Get() const { return m_descriptor; }

private:
    int m_descriptor;
};

/// With its whole mode from the first moment on, whatever the umask; never one that is there already.
int CreateIn(int directory) {
    const mode_t mask = ::umask(0);
    const int file = ::openat(directory, NAME, O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, MODE);
    const int code = errno;
    ::umask(mask);
    errno = code;
    return file;
}

void Make(const std::string& path) {
    const Descriptor directory(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NOFOLLOW));
    struct stat status {};
    if (::fstat(directory.Get(), &status) != 0)
        ThrowErrno(errno);
    // Checked before: a file of this user's own is what keeps the other users out.
    if (const uid_t self = ::geteuid(); self != 0 && self != status.st_uid)
        ThrowErrno(EPERM);
    const Descriptor file(CreateIn(directory.Get()));
    if (::geteuid() != status.st_uid && ::fchown(file.Get(), status.st_uid, status.st_gid) != 0)
        ThrowErrno(errno);
}

void LookAt(terminal::Worklog& log, const std::string& file, const struct stat& status,
            uid_t directoryOwner) {
    if (!S_ISREG(status.st_mode)) {
        log.Fail(fmt::format("{} is no regular file. Remove it and run this again.", file));
        return;
    }
    log.AlreadyDone(fmt::format("pid file {}", file));
    if (status.st_uid != directoryOwner)
        log.Warn(
            fmt::format("{} does not belong to its directory's owner: the services of other users may not be "
                        "able to start. Run: sudo chown --no-dereference {} {}",
                        file, directoryOwner, terminal::ShellQuoted(file)));
    if ((status.st_mode & MODE) != MODE)
        log.Warn(fmt::format("{} may not be written by all: the services of other users cannot start. Run: "
                             "sudo chmod 0666 {}",
                             file, terminal::ShellQuoted(file)));
}

} // namespace

std::string CommandForPidFile(const std::string& directory) {
    return fmt::format("sudo install -m 0666 /dev/null {}", terminal::ShellQuoted(directory + "/" + NAME));
}

void EnsurePidFile(terminal::Worklog& log, const std::string& directory) {
    const auto file = directory + "/" + NAME;
    struct stat owner {};
    struct stat status {};
    if (::lstat(directory.c_str(), &owner) == 0 && ::lstat(file.c_str(), &status) == 0)
        LookAt(log, file, status, owner.st_uid);
    else
        log.Run(
            terminal::MAKE, fmt::format("pid file {} (mode {:04o})", file, MODE), [&] { Make(directory); },
            "Its directory's owner must do that. Run: " + CommandForPidFile(directory));
}

} // namespace reportctl::setup
