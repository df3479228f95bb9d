#pragma once

#include <chrono>
#include <functional>
#include <optional>

#include "Modules/MetrikSdk/otlp/Sender.h"
#include "Modules/MetrikSdk/outbox/CountWaiter.h"
#include "Modules/MetrikSdk/outbox/Outbox.h"
#include "Modules/MetrikSdk/upload/BatchSplitter.h"

namespace MetrikSdk::upload {

/// What to wait for before the next pass.
struct Pause {
    std::chrono::milliseconds duration{0};                  ///< At most this long.
    std::int64_t untilWaiting = outbox::CountWaiter::NEVER; ///< Or until so many events wait.
};

/// One upload after another: takes a batch, sends it, and does with it what the answer says. No thread of its
/// own, and no clock: the caller passes the time and sleeps.
///
/// An event leaves the outbox only through here (or for a cap): after its delivery is known, or with its
/// verdict into the dead letters. What was delivered and could not be deleted, for a full disk say, is kept
/// in mind and deleted before anything else is sent.
///
/// Threads: one. Failure: told to the notifier, and waited for.
class UploadCycle {
public:
    UploadCycle(outbox::Outbox& outbox, otlp::Sender& sender, report::Notifier& notifier,
                const OutboxSettings& settings, std::function<double()> random);

    Pause Pass(WallTime now);

private:
    class UnderWay;
    struct Removal {
        Batch batch;
        std::size_t refused = 0;
    };

    Pause TakeAndSend(WallTime now);
    Pause Act(Batch batch, const otlp::HttpResult& result, WallTime now);
    Pause Delivered(Batch batch, const otlp::HttpResult& result);
    Pause Refused(const Batch& batch, const otlp::HttpResult& result, WallTime now);
    Pause MoveToDeadLetters(const StoredEvent& event, const otlp::HttpResult& result, WallTime now);
    Pause WaitAfter(const otlp::HttpResult& result, WallTime now);
    void Settle();

    outbox::Outbox& m_outbox;
    otlp::Sender& m_sender;
    report::Notifier& m_notifier;
    const OutboxSettings m_settings;
    std::function<double()> m_random; ///< Uniform in [0, 1).
    BatchSplitter m_splitter;
    std::optional<Removal> m_removal; ///< Delivered, and not deleted yet.
    int m_failures = 0;               ///< Requests in a row that must be repeated.
    int m_refusalsInARow = 0;         ///< Events refused for good since one was last accepted.
};

} // namespace MetrikSdk::upload
