#pragma once

#include <future>
#include <memory>
#include <thread>

#include "Modules/MetrikSdk/otlp/Sender.h"

namespace MetrikSdk::process {
struct OutboxCore;
}

namespace MetrikSdk::upload {

/// The thread that sends the events of an outbox. It runs from construction to destruction.
///
/// Destruction ends the running request and waits for the thread, for OutboxSettings::stopPatience at most. A
/// thread that hangs in the file system is detached, and keeps alive what it uses. Events that were not sent
/// stay in the outbox.
/// Threads: any may construct and destroy it. When its own thread destroys it, because a crash handler on
/// that thread called exit(), it waits for nothing.
/// Failure: construction throws what creating a thread throws.
class Uploader {
public:
    Uploader(std::shared_ptr<process::OutboxCore> core, std::shared_ptr<otlp::Sender> sender);
    ~Uploader();
    Uploader(const Uploader&) = delete;
    Uploader& operator=(const Uploader&) = delete;

private:
    std::shared_ptr<process::OutboxCore> m_core;
    std::shared_ptr<otlp::Sender> m_sender;
    std::future<void> m_finished;
    std::thread m_thread;
};

} // namespace MetrikSdk::upload
