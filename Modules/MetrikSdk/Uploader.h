#pragma once

#include <future>
#include <memory>
#include <thread>

#include "Modules/MetrikSdk/Notifier.h"
#include "Modules/MetrikSdk/Outbox.h"
#include "Modules/MetrikSdk/Sender.h"
#include "Modules/MetrikSdk/Settings.h"

namespace Metrik {

/// What an outbox's users and its uploader share. Lives as long as any of them.
struct OutboxCore {
    OutboxCore(const std::string& directory, const OutboxSettings& outboxSettings,
               std::shared_ptr<FailureReporter> reporter)
        : settings(outboxSettings), notifier(std::move(reporter)), outbox(directory, settings, notifier) {}

    const OutboxSettings settings;
    Notifier notifier;
    Outbox outbox;
};

/// The thread that empties an outbox: runs from construction to destruction.
///
/// Destruction ends the request under way and waits for the thread, OutboxSettings::stopPatience at most: one
/// that hangs in the file system is left to itself, with its share of what it uses. What was not sent stays
/// in the outbox.
/// Threads: constructed and destroyed by any; destroyed by its own thread (a crash handler there may call
/// exit()) it waits for nothing.
/// Failure: construction throws what creating a thread throws.
class Uploader {
public:
    Uploader(std::shared_ptr<OutboxCore> core, std::shared_ptr<Sender> sender);
    ~Uploader();
    Uploader(const Uploader&) = delete;
    Uploader& operator=(const Uploader&) = delete;

private:
    std::shared_ptr<OutboxCore> m_core;
    std::shared_ptr<Sender> m_sender;
    std::future<void> m_finished;
    std::thread m_thread;
};

} // namespace Metrik
