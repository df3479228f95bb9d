#include "Modules/MetrikSdk/upload/UploadCycle.h"

#include <utility>

#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"
#include "Modules/MetrikSdk/outbox/StoreError.h"

namespace MetrikSdk::upload {

/// While this object lives, no cap drops the batch that is being sent. A batch that was delivered but not
/// deleted yet stays protected until Settle: a cap that dropped it would count it as lost.
class UploadCycle::UnderWay {
public:
    explicit UnderWay(UploadCycle& cycle) : m_cycle(cycle) {}
    ~UnderWay() {
        if (!m_cycle.m_removal)
            m_cycle.m_outbox.Release();
    }
    UnderWay(const UnderWay&) = delete;
    UnderWay& operator=(const UnderWay&) = delete;

private:
    UploadCycle& m_cycle;
};

UploadCycle::UploadCycle(outbox::Outbox& outbox, otlp::Sender& sender, report::Notifier& notifier,
                         const OutboxSettings& settings, std::function<double()> random)
    : m_outbox(outbox), m_sender(sender), m_notifier(notifier), m_settings(settings),
      m_random(std::move(random)), m_rules(m_settings) {}

QueueHead UploadCycle::Queue::TakeOldest(std::size_t maxEvents, const EventKeys& without) {
    batch = m_outbox.Take(maxEvents, without);
    return HeadOf(batch, maxEvents, m_settings);
}

bool UploadCycle::Queue::TakeOne(const EventKey& key) {
    batch = m_outbox.TakeOne(key);
    return !batch.events.empty();
}

bool UploadCycle::Queue::HasOthersThan(const EventKeys& these) {
    return !m_outbox.Take(1, these).events.empty();
}

Pause UploadCycle::Pass(WallTime now) {
    try {
        Settle();
        return TakeAndSend(now);
    } catch (const outbox::StoreError& error) {
        m_notifier.TellFailure({CauseOf(error), error.what()});
        return m_rules.QueueFailed(m_random(), now);
    }
}

Pause UploadCycle::TakeAndSend(WallTime now) {
    const UnderWay underWay(*this);
    Queue queue(m_outbox, m_settings.batch);
    const auto next = m_rules.WhatNext(queue, now);
    if (next.count == 0)
        return next.pause;
    queue.batch.events.resize(next.count);
    return Send(std::move(queue.batch), next.isAside, now);
}

Pause UploadCycle::Send(Batch batch, bool isAside, WallTime now) {
    const auto body = EncodeWithinBound(batch);
    const auto& first = batch.events.front();
    const UploadRules::Sent sent{
        {batch.events.size(), body.size()}, isAside, EventKey{first.row, first.uuid}};
    const auto result = m_sender.Post(body);
    Queue queue(m_outbox, m_settings.batch);
    const auto decision = m_rules.Answered(sent, result, m_random(), now, queue);
    Act({std::move(batch), sent, result}, decision);
    return decision.pause;
}

/// Encodes the batch. Leaves out its last events when the body would be too long.
std::string UploadCycle::EncodeWithinBound(Batch& batch) const {
    for (;;) {
        auto body = otlp::EncodeOtlp(batch, m_settings.resource);
        const auto fitting = m_rules.Fitting({batch.events.size(), body.size()});
        if (fitting == batch.events.size())
            return body;
        batch.events.resize(fitting);
    }
}

void UploadCycle::Act(Exchange exchange, const UploadRules::Decision& decision) {
    using Outcome = UploadRules::Outcome;
    switch (decision.outcome) {
    case Outcome::Taken:
        return Delivered(std::move(exchange));
    case Outcome::NotNow:
        return TellNotNow(exchange);
    case Outcome::StaysAside:
        return TellFirstStrike(exchange, decision.strikes);
    case Outcome::OutOfStrikes:
        return MoveToDeadLetters(exchange,
                                 "not taken at " + std::to_string(decision.strikes.tries) +
                                     " tries, while others were: " + RetryPolicy::Describe(exchange.result));
    case Outcome::Refused:
        return MoveToDeadLetters(exchange, RetryPolicy::Describe(exchange.result));
    case Outcome::Halved:
    case Outcome::Abandoned:
        return;
    }
}

void UploadCycle::TellNotNow(const Exchange& exchange) {
    const auto text =
        m_sender.Destination() + ": " + Describe(exchange.result) + "; the events stay in the outbox";
    m_notifier.TellFailure({report::Cause::Upload, text});
    Note(text);
}

/// The log forgets: under load it goes round within seconds, and the next failure may be told minutes later.
/// So the first failure since a delivery is kept in the file, too, where a reader looks whether uploads work.
void UploadCycle::Note(const std::string& failure) {
    if (m_isFailureNoted)
        return;
    try {
        m_outbox.NoteUploadFailure(failure);
        m_isFailureNoted = true;
    } catch (const outbox::StoreError&) {
        // The next failure tries again, and the next event tells of the file.
    }
}

std::string UploadCycle::Describe(const otlp::HttpResult& result) const {
    const auto lookAt = RetryPolicy::LookAt(result, m_sender.HeaderNames(), m_sender.Variables());
    return RetryPolicy::Describe(result) + (lookAt.empty() ? "" : "; " + lookAt);
}

void UploadCycle::TellFirstStrike(const Exchange& exchange, const AsideList::Strikes& strikes) {
    if (strikes.isNew && strikes.tries == 1)
        m_notifier.TellFailure({report::Cause::Refusal, "An event is not taken while others are, and will be "
                                                        "tried again from time to time: " +
                                                            RetryPolicy::Describe(exchange.result)});
}

void UploadCycle::Delivered(Exchange exchange) {
    m_isFailureNoted = false;
    const auto count = exchange.batch.events.size();
    const auto partial = RetryPolicy::ReadPartialSuccess(exchange.result, count);
    m_removal = Removal{std::move(exchange.batch), partial.rejected};
    TellDelivery(count, partial);
    Settle();
}

void UploadCycle::TellDelivery(std::size_t count, const PartialSuccess& partial) {
    TellPartialSuccess(count, partial);
    m_notifier.TellSuccess("upload", std::to_string(count - partial.rejected) + " events");
    m_notifier.TellFailure({report::Cause::Upload, m_sender.Destination() + ": events are taken again",
                            report::News::Kind::End});
}

void UploadCycle::TellPartialSuccess(std::size_t count, const PartialSuccess& partial) {
    const auto total = std::to_string(count);
    if (!partial.impossible.empty())
        m_notifier.TellFailure({report::Cause::Refusal,
                                "The collector says that it rejected " + partial.impossible + " of " + total +
                                    " events, which cannot be; " + std::to_string(partial.rejected) +
                                    " count as refused: " + partial.message});
    else if (partial.rejected > 0)
        m_notifier.TellFailure({report::Cause::Refusal, "The collector rejected " +
                                                            std::to_string(partial.rejected) + " of " +
                                                            total + " events for good: " + partial.message});
    else if (!partial.message.empty())
        m_notifier.TellFailure(
            {report::Cause::Warning, "The collector took " + total + " events and says: " + partial.message});
}

void UploadCycle::Settle() {
    if (!m_removal)
        return;
    m_outbox.RemoveDelivered(m_removal->batch, m_removal->refused);
    m_removal.reset();
    m_outbox.Release();
}

void UploadCycle::MoveToDeadLetters(const Exchange& exchange, const std::string& reason) {
    m_outbox.MoveToDeadLetters(exchange.batch.events.front(), {exchange.result.status, reason});
    m_rules.MovedToDeadLetters(exchange.sent);
    m_notifier.TellFailure(
        {report::Cause::Refusal, "An event was refused for good and moved to the dead letters: " + reason});
}

} // namespace MetrikSdk::upload
