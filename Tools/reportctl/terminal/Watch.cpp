#include "Tools/reportctl/terminal/Watch.h"

#include <csignal>

#include <poll.h>
#include <unistd.h>

namespace reportctl::terminal {
namespace {

volatile std::sig_atomic_t g_isToEnd = 0; // a signal handler may write to this type

extern "C" void EndTheWatch(int) {
    g_isToEnd = 1;
}

void Handle(void (*handler)(int)) {
    struct sigaction action {};
    action.sa_handler = handler;
    for (const int signal : {SIGINT, SIGTERM})
        ::sigaction(signal, &action, nullptr);
}

/// The signals that end the command. Wait blocks them before it reads g_isToEnd, and ppoll unblocks them
/// while it waits. Otherwise a signal that comes between the two would be noticed only after the wait.
sigset_t TheSignals() {
    sigset_t signals;
    ::sigemptyset(&signals);
    ::sigaddset(&signals, SIGINT);
    ::sigaddset(&signals, SIGTERM);
    return signals;
}

} // namespace

Watch::Watch() {
    g_isToEnd = 0;
    Handle(EndTheWatch);
}

Watch::~Watch() {
    Handle(SIG_DFL);
}

bool Watch::Wait(std::chrono::milliseconds time) {
    const auto signals = TheSignals();
    sigset_t before;
    ::pthread_sigmask(SIG_BLOCK, &signals, &before);
    pollfd output{.fd = STDOUT_FILENO, .events = 0, .revents = 0};
    const auto seconds = std::chrono::floor<std::chrono::seconds>(time);
    const timespec limit{.tv_sec = seconds.count(),
                         .tv_nsec = std::chrono::nanoseconds(time - seconds).count()};
    if (g_isToEnd == 0)
        ::ppoll(&output, 1, &limit, &before);
    ::pthread_sigmask(SIG_SETMASK, &before, nullptr);
    return g_isToEnd == 0 && (output.revents & POLLERR) == 0;
}

} // namespace reportctl::terminal
