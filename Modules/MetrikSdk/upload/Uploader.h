#pragma once

#include <future>
#include <memory>
#include <thread>

#include "Modules/MetrikSdk/otlp/Sender.h"

namespace MetrikSdk::process {
struct OutboxCore;
}

namespace MetrikSdk::upload {

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
