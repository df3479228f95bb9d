#pragma once

#include <functional>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/otlp/Sender.h"
#include "Modules/MetrikSdk/outbox/Outbox.h"
#include "Modules/MetrikSdk/upload/UploadRules.h"

namespace MetrikSdk::upload {

/// Does one upload after the other: takes a batch, sends it, treats its events as the answer says, and tells.
/// It has no thread and no clock: the caller passes the time and sleeps. UploadRules decides everything.
///
/// An event leaves the outbox only through this class (or for a cap): after it was delivered, or to the dead
/// letters after a verdict. Delivered events that could not be deleted, for example because the disk is full,
/// are remembered and deleted before anything else is sent.
///
/// Threads: one. Failure: reported to the notifier; the next pass comes after a wait.
class UploadCycle {
public:
    UploadCycle(outbox::Outbox& outbox, otlp::Sender& sender, report::Notifier& notifier,
                const OutboxSettings& settings, std::function<double()> random);

    Pause Pass(WallTime now);

private:
    class UnderWay;

    /// The outbox, and the batch that the rules looked at last.
    class Queue : public EventQueue {
    public:
        Queue(outbox::Outbox& outbox, const BatchSettings& settings)
            : m_outbox(outbox), m_settings(settings) {}

        QueueHead TakeOldest(std::size_t maxEvents, const EventKeys& without) override;
        bool TakeOne(const EventKey& key) override;
        bool HasOthersThan(const EventKeys& these) override;

        Batch batch;

    private:
        outbox::Outbox& m_outbox;
        const BatchSettings& m_settings;
    };

    struct Removal {
        Batch batch;
        std::size_t refused = 0;
    };
    /// A request and its answer.
    struct Exchange {
        Batch batch;
        UploadRules::Sent sent;
        otlp::HttpResult result;
    };

    Pause TakeAndSend(WallTime now);
    Pause Send(Batch batch, bool isAside, WallTime now);
    std::string EncodeWithinBound(Batch& batch) const;
    void Act(Exchange exchange, const UploadRules::Decision& decision);
    std::string Describe(const otlp::HttpResult& result) const;
    void Delivered(Exchange exchange);
    void TellDelivery(std::size_t count, const PartialSuccess& partial);
    void TellPartialSuccess(std::size_t count, const PartialSuccess& partial);
    void TellNotNow(const Exchange& exchange);
    void Note(const std::string& failure);
    void TellFirstStrike(const Exchange& exchange, const AsideList::Strikes& strikes);
    void MoveToDeadLetters(const Exchange& exchange, const std::string& reason);
    void Settle();

    outbox::Outbox& m_outbox;
    otlp::Sender& m_sender;
    report::Notifier& m_notifier;
    const OutboxSettings m_settings;
    std::function<double()> m_random; ///< Uniform in [0, 1).
    UploadRules m_rules;
    std::optional<Removal> m_removal; ///< Delivered, and not deleted yet.
    bool m_isFailureNoted = false;    ///< That of the failures since the last delivery.
};

} // namespace MetrikSdk::upload
