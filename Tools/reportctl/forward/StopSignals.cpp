#include "Tools/reportctl/forward/StopSignals.h"

#include <csignal>
#include <utility>

#include <pthread.h>

namespace reportctl::forward {
namespace {

/// SIGUSR1 ends the thread itself.
sigset_t Signals() {
    sigset_t signals;
    ::sigemptyset(&signals);
    for (const int signal : {SIGINT, SIGTERM, SIGUSR1})
        ::sigaddset(&signals, signal);
    return signals;
}

} // namespace

StopSignals::StopSignals(std::function<void()> abandon) : m_abandon(std::move(abandon)) {
    const auto signals = Signals();
    ::pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    m_thread = std::thread([this] { Take(); });
}

StopSignals::~StopSignals() {
    ::pthread_kill(m_thread.native_handle(), SIGUSR1);
    m_thread.join();
    const auto signals = Signals();
    ::pthread_sigmask(SIG_UNBLOCK, &signals, nullptr);
}

void StopSignals::Take() {
    const auto signals = Signals();
    for (int signal = 0; ::sigwait(&signals, &signal) == 0 && signal != SIGUSR1;) {
        const std::lock_guard lock(m_mutex);
        m_hasCome = true;
        m_abandon();
        m_wake.notify_all();
    }
}

bool StopSignals::Wait(std::chrono::milliseconds time) {
    std::unique_lock lock(m_mutex);
    return !m_wake.wait_for(lock, time, [this] { return m_hasCome; });
}

} // namespace reportctl::forward
