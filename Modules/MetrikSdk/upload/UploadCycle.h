#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/otlp/Sender.h"
#include "Modules/MetrikSdk/outbox/CountWaiter.h"
#include "Modules/MetrikSdk/outbox/Outbox.h"
#include "Modules/MetrikSdk/upload/AsideList.h"
#include "Modules/MetrikSdk/upload/BatchSizer.h"
#include "Modules/MetrikSdk/upload/RetryPolicy.h"

namespace MetrikSdk::upload {

/// What to wait for before the next pass.
struct Pause {
    std::chrono::milliseconds duration{0};                  ///< At most this long.
    std::int64_t untilWaiting = outbox::CountWaiter::NEVER; ///< Or until so many events wait.
};

/// Does one upload after the other: takes a batch, sends it, and treats its events as the answer says. It has
/// no thread and no clock: the caller passes the time and sleeps.
///
/// An event leaves the outbox only through this class (or for a cap): after it was delivered, or to the dead
/// letters after a verdict. Delivered events that could not be deleted, for example because the disk is full,
/// are remembered and deleted before anything else is sent. BatchPlan and BatchSizer decide which events are
/// sent. AsideList does so for events that the collector does not take.
///
/// Threads: one. Failure: reported to the notifier; the next pass comes after a wait.
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
    /// A request and its answer.
    struct Exchange {
        Batch batch;
        bool isAside = false; ///< The batch is one event that had been set aside.
        std::size_t bodyBytes = 0;
        otlp::HttpResult result;

        RequestSize Size() const { return {batch.events.size(), bodyBytes}; }
    };

    Pause TakeAndSend(WallTime now);
    std::optional<Pause> TryAside(WallTime now);
    Pause Idle(WallTime now) const;
    Pause Send(Batch batch, bool isAside, WallTime now);
    std::string EncodeWithinBound(Batch& batch) const;
    Pause Act(Exchange exchange, WallTime now);
    std::string Describe(const otlp::HttpResult& result) const;
    Pause Delivered(Exchange exchange);
    void TellDelivery(std::size_t count, const PartialSuccess& partial);
    void TellPartialSuccess(std::size_t count, const PartialSuccess& partial);
    Pause NotTaken(const Exchange& exchange, Verdict verdict, WallTime now);
    void StepAside(const StoredEvent& event, WallTime now);
    Pause AsideFailed(const Exchange& exchange, WallTime now);
    Pause Refused(const Exchange& exchange, Blame blame, WallTime now);
    void MoveToDeadLetters(const Exchange& exchange, const std::string& reason);
    Pause WaitAfterRefusals(const otlp::HttpResult& result, WallTime now);
    Pause WaitAfter(const otlp::HttpResult& result, WallTime now);
    void Settle();

    outbox::Outbox& m_outbox;
    otlp::Sender& m_sender;
    report::Notifier& m_notifier;
    const OutboxSettings m_settings;
    std::function<double()> m_random; ///< Uniform in [0, 1).
    BatchSizer m_sizer;
    AsideList m_aside;
    bool m_isAsidesTurn = false;      ///< A batch was taken since the last try of an event that is aside.
    std::optional<Removal> m_removal; ///< Events that were delivered, but are not deleted yet.
    int m_failures = 0;               ///< Requests in a row that must be repeated.
    int m_refusalsInARow = 0;         ///< Events that were refused for good since the last accepted one.
};

} // namespace MetrikSdk::upload
