#include "Tools/reportctl/service/Lock.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Common/Paths.h"
#include "SystemTool/IO/Descriptor.h"
#include "Tools/reportctl/service/Program.h"

namespace reportctl::service {
namespace {

std::string ProblemOf(const std::string& path) {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0)
        return {}; // the service makes it
    if (!S_ISREG(status.st_mode))
        return fmt::format("{} is no regular file. Remove it, run `reportctl setup`, and start the service.",
                           path);
    if (::access(path.c_str(), R_OK | W_OK) != 0)
        return fmt::format("{} may not be written by this user, so its service cannot start. Run `reportctl "
                           "setup`, which names the command that helps.",
                           path);
    return {};
}

} // namespace

Lock LookAtLock() {
    const auto path = SyncServiceReport::Paths::PidFile();
    Lock lock;
    lock.problem = ProblemOf(path);
    const SystemTool::IO::Descriptor file(
        ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    struct flock whole {};
    whole.l_type = F_WRLCK;
    whole.l_whence = SEEK_SET;
    if (!file.IsOpen() || ::fcntl(file.Number(), F_GETLK, &whole) != 0 || whole.l_type == F_UNLCK)
        return lock;
    lock.isHeld = true;
    if (whole.l_pid > 0) // -1: a lock that belongs to an open file; 0: a process in an outer container
        lock.holder = whole.l_pid;
    return lock;
}

std::optional<pid_t> LockedService() {
    const auto holder = LookAtLock().holder;
    return holder && IsService(*holder) ? holder : std::nullopt;
}

} // namespace reportctl::service
