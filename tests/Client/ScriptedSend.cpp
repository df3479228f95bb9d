#include "tests/Client/ScriptedSend.h"

#include <atomic>
#include <cerrno>
#include <utility>

#include <sys/socket.h>

namespace {

std::atomic<int> g_error = 0;
std::atomic<bool> g_swallowsRefusals = false;

} // namespace

void FailNextSend(int error) {
    g_error = error;
}

void SwallowRefusals() {
    g_swallowsRefusals = true;
}

// The names that the linker's option --wrap asks for.
extern "C" ssize_t __real_send(int socket, const void* data, std::size_t bytes,
                               int flags); // NOLINT(bugprone-*,cert-*)

extern "C" ssize_t __wrap_send(int socket, const void* data, std::size_t bytes,
                               int flags) { // NOLINT(bugprone-*,cert-*)
    if (const int error = g_error.exchange(0); error != 0) {
        errno = error;
        return -1;
    }
    return __real_send(socket, data, bytes, flags);
}

// NOLINTBEGIN(bugprone-*,cert-*)
extern "C" int __real_getsockopt(int socket, int level, int name, void* value, socklen_t* length);

extern "C" int __wrap_getsockopt(int socket, int level, int name, void* value, socklen_t* length) {
    const int result = __real_getsockopt(socket, level, name, value, length);
    if (g_swallowsRefusals && level == SOL_SOCKET && name == SO_ERROR)
        *static_cast<int*>(value) = 0;
    return result;
}
// NOLINTEND(bugprone-*,cert-*)
