#include "Tools/reportctl/service/Turn.h"

#include <cerrno>
#include <system_error>

#include <fcntl.h>
#include <fmt/format.h>
#include <unistd.h>

#include "Common/Paths.h"
#include "Tools/reportctl/service/Program.h"

namespace reportctl::service {
namespace {

/// Waits until the lock of the pid file is free, by taking it. execv closes the file and so releases the
/// lock, and the service takes it again. When another service takes it first, ours refuses to start, and the
/// caller tries again.
void AwaitLock() {
    const int file = ::open(SyncServiceReport::Paths::PidFile().c_str(), O_RDWR | O_CLOEXEC | O_NOFOLLOW);
    if (file < 0)
        return;
    struct flock whole {};
    whole.l_type = F_WRLCK;
    whole.l_whence = SEEK_SET;
    while (::fcntl(file, F_SETLKW, &whole) != 0 && errno == EINTR) {
    }
}

} // namespace

int TakeTurn() {
    auto program = ProgramPath();
    if (program.empty()) {
        fmt::print(stderr, "error: SyncServiceReport is not installed beside reportctl. Install it again.\n");
        return 1;
    }
    AwaitLock();
    char* const arguments[] = {program.data(), nullptr};
    ::execv(program.c_str(), arguments);
    fmt::print(stderr, "error: cannot run {}: {}\n", program, std::generic_category().message(errno));
    return 1;
}

} // namespace reportctl::service
