#include "Modules/MetrikSdk/upload/Uploader.h"

#include <random>
#include <utility>

#include <csignal>

#include <pthread.h>

#include "Modules/MetrikSdk/process/OutboxCore.h"
#include "Modules/MetrikSdk/upload/UploadCycle.h"
#include "SystemTool/ThreadHeap.h"

namespace MetrikSdk::upload {
namespace {

/// The signals that the thread must not get: all but those of its own faults, which the service's crash
/// handler needs. One of the blocked signals is SIGPIPE: a write to a TLS connection that the collector has
/// closed would raise it.
sigset_t SignalsToBlock() {
    sigset_t signals;
    ::sigfillset(&signals);
    for (const int fault : {SIGSEGV, SIGBUS, SIGFPE, SIGILL, SIGABRT, SIGTRAP, SIGSYS})
        ::sigdelset(&signals, fault);
    return signals;
}

/// Blocks signals on this thread while it lives. A new thread begins with the mask of the thread that makes
/// it, so there is no moment in which it could get a signal.
class BlockedSignals {
public:
    BlockedSignals() {
        const auto signals = SignalsToBlock();
        ::pthread_sigmask(SIG_BLOCK, &signals, &m_before);
    }
    ~BlockedSignals() { ::pthread_sigmask(SIG_SETMASK, &m_before, nullptr); }
    BlockedSignals(const BlockedSignals&) = delete;
    BlockedSignals& operator=(const BlockedSignals&) = delete;

private:
    sigset_t m_before{};
};

/// Uniform in [0, 1).
class Chance {
public:
    double operator()() { return m_uniform(m_generator); }

private:
    std::mt19937_64 m_generator{std::random_device{}()};
    std::uniform_real_distribution<double> m_uniform{0.0, 1.0};
};

/// New events do not shorten this wait: every start is reported as an event, and machines that start together
/// would send these events together.
void WaitForTheFirstRequest(process::OutboxCore& core) {
    const auto wait = RetryPolicy::WaitAtStart(Chance()(), core.settings.retry);
    core.outbox.WaitingCount().Await(outbox::CountWaiter::NEVER, std::chrono::steady_clock::now() + wait);
}

void RunUploads(process::OutboxCore& core, otlp::Sender& sender) {
    UploadCycle cycle(core.outbox, sender, core.notifier, core.settings, Chance());
    auto& waiting = core.outbox.WaitingCount();
    while (!waiting.Stopped()) {
        const auto pause = cycle.Pass(WallNow());
        if (pause.duration > std::chrono::milliseconds(0))
            waiting.Await(pause.untilWaiting, std::chrono::steady_clock::now() + pause.duration);
    }
}

void TellFailure(process::OutboxCore& core, const char* reason) noexcept {
    try {
        core.notifier.TellFailure({report::Cause::Upload, reason});
    } catch (...) { // no memory for the text
    }
}

/// An unexpected exception, such as a lack of memory, must not end the service. So the uploads begin again.
void RunUntilStopped(process::OutboxCore& core, otlp::Sender& sender) noexcept {
    constexpr std::chrono::seconds RECOVERY(10);
    auto& waiting = core.outbox.WaitingCount();
    bool isFirst = true;
    while (!waiting.Stopped()) {
        try {
            if (std::exchange(isFirst, false))
                WaitForTheFirstRequest(core);
            RunUploads(core, sender);
        } catch (const std::exception& error) {
            TellFailure(core, error.what());
            waiting.Await(outbox::CountWaiter::NEVER, std::chrono::steady_clock::now() + RECOVERY);
        }
    }
}

} // namespace

Uploader::Uploader(std::shared_ptr<process::OutboxCore> core, std::shared_ptr<otlp::Sender> sender)
    : m_core(std::move(core)), m_sender(std::move(sender)) {
    std::promise<void> finished;
    m_finished = finished.get_future();
    const BlockedSignals blocked;
    m_thread =
        std::thread([sharedCore = m_core, sharedSender = m_sender, done = std::move(finished)]() mutable {
            SystemTool::PrepareHeap();
            RunUntilStopped(*sharedCore, *sharedSender);
            sharedSender.reset();
            sharedCore.reset();
            done.set_value();
        });
}

Uploader::~Uploader() {
    m_core->outbox.WaitingCount().Stop();
    m_sender->Abandon();
    const bool itself = m_thread.get_id() == std::this_thread::get_id();
    if (!itself && m_finished.wait_for(m_core->settings.stopPatience) == std::future_status::ready)
        m_thread.join();
    else
        m_thread.detach();
}

} // namespace MetrikSdk::upload
