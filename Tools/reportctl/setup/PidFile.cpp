#include "Tools/reportctl/setup/PidFile.h"

#include <cerrno>

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Common/Paths.h"
#include "SystemTool/Errno.h"
#include "SystemTool/IO/Descriptor.h"
#include "Tools/reportctl/terminal/ShellQuoted.h"

namespace reportctl::setup {
namespace {

namespace Paths = SyncServiceReport::Paths;
using SystemTool::IO::Descriptor;

constexpr mode_t MODE = 0666;

Descriptor Opened(int number) {
    if (number < 0)
        SystemTool::ThrowErrno(errno);
    return Descriptor(number);
}

/// Creates the file with its full mode from the start; the umask takes nothing from it. An existing file is
/// never replaced.
int CreateIn(int directory) {
    const auto name = Paths::PidFileName();
    const mode_t mask = ::umask(0);
    const int file =
        ::openat(directory, name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, MODE);
    const int code = errno;
    ::umask(mask);
    errno = code;
    return file;
}

void Make(const std::string& path) {
    const auto directory = Opened(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NOFOLLOW));
    struct stat status {};
    if (::fstat(directory.Number(), &status) != 0)
        SystemTool::ThrowErrno(errno);
    // Checked before the file is made: a file that belongs to this user would keep the other users out.
    if (const uid_t self = ::geteuid(); self != 0 && self != status.st_uid)
        SystemTool::ThrowErrno(EPERM);
    const Descriptor file(CreateIn(directory.Number()));
    if (!file.IsOpen() && errno == EEXIST)
        throw terminal::AlreadyThere();
    if (!file.IsOpen())
        SystemTool::ThrowErrno(errno);
    if (::geteuid() != status.st_uid && ::fchown(file.Number(), status.st_uid, status.st_gid) != 0)
        SystemTool::ThrowErrno(errno);
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
    return fmt::format("sudo install -m 0666 /dev/null {}", terminal::ShellQuoted(Paths::PidFile(directory)));
}

void EnsurePidFile(terminal::Worklog& log, const std::string& directory) {
    const auto file = Paths::PidFile(directory);
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
