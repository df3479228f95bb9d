#include "Modules/MetrikSdk/upload/UploadCycle.h"

#include <algorithm>
#include <utility>

#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"
#include "Modules/MetrikSdk/outbox/StoreError.h"
#include "Modules/MetrikSdk/upload/BatchPlan.h"

namespace MetrikSdk::upload {
namespace {

/// How often an idle uploader looks again. Another process may have stored events, or the file may be back.
constexpr std::chrono::milliseconds IDLE = std::chrono::seconds(30);

constexpr Pause AT_ONCE{};

} // namespace

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
      m_random(std::move(random)), m_sizer(settings.batch.maxEvents), m_aside(settings.aside) {}

Pause UploadCycle::Pass(WallTime now) {
    try {
        Settle();
        return TakeAndSend(now);
    } catch (const outbox::StoreError& error) {
        m_notifier.TellFailure({CauseOf(error), error.what()});
        otlp::HttpResult none;
        none.fault = error.what();
        return {RetryPolicy::WaitBefore(none, ++m_failures, m_random(), now, m_settings.retry),
                outbox::CountWaiter::NEVER};
    }
}

Pause UploadCycle::TakeAndSend(WallTime now) {
    const UnderWay underWay(*this);
    if (m_isAsidesTurn)
        if (const auto pause = TryAside(now))
            return *pause;
    auto batch = m_outbox.Take(m_sizer.MaxEvents(), m_aside.Keys());
    const auto plan = PlanBatch(batch, m_sizer.MaxEvents(), now, m_settings.batch);
    if (plan.count == 0)
        return TryAside(now).value_or(Idle(now));
    if (plan.wait > std::chrono::milliseconds(0))
        return {plan.wait, static_cast<std::int64_t>(m_settings.batch.maxEvents + m_aside.Keys().size())};
    batch.events.resize(plan.count);
    return Send(std::move(batch), false, now);
}

/// Tries an event that is aside and due, if there is one.
std::optional<Pause> UploadCycle::TryAside(WallTime now) {
    while (const auto due = m_aside.Due(now)) {
        auto batch = m_outbox.TakeOne(*due);
        if (!batch.events.empty()) {
            m_isAsidesTurn = false;
            return Send(std::move(batch), true, now);
        }
        m_aside.Remove(due->row); // a cap dropped it, or the file is another one
    }
    return std::nullopt;
}

Pause UploadCycle::Idle(WallTime now) const {
    return {std::min(IDLE, m_aside.UntilDue(now).value_or(IDLE)),
            static_cast<std::int64_t>(m_aside.Keys().size() + 1)};
}

Pause UploadCycle::Send(Batch batch, bool isAside, WallTime now) {
    const auto body = EncodeWithinBound(batch);
    const auto result = m_sender.Post(body);
    const auto pause = Act({std::move(batch), isAside, body.size(), result}, now);
    const auto wished = RetryPolicy::WishedWait(result, now, m_settings.retry);
    return wished > pause.duration ? Pause{wished} : pause;
}

/// Encodes the batch. Leaves out its last events when the body would be too long.
std::string UploadCycle::EncodeWithinBound(Batch& batch) const {
    auto body = otlp::EncodeOtlp(batch, m_settings.resource);
    while (body.size() > m_sizer.MaxBodyBytes() && batch.events.size() > 1) {
        const auto fitting = batch.events.size() * m_sizer.MaxBodyBytes() / body.size();
        batch.events.resize(std::max<std::size_t>(1, fitting));
        body = otlp::EncodeOtlp(batch, m_settings.resource);
    }
    return body;
}

Pause UploadCycle::Act(Exchange exchange, WallTime now) {
    const auto verdict = RetryPolicy::Judge(exchange.result);
    switch (verdict) {
    case Verdict::Delete:
        return Delivered(std::move(exchange));
    case Verdict::Halve:
        return Refused(exchange, Blame::Event, now);
    case Verdict::HalveForSize:
        return Refused(exchange, Blame::TooLarge, now);
    case Verdict::Wait:
    case Verdict::WaitAndHalve:
    case Verdict::WaitThenHalve:
        break;
    }
    return exchange.result.abandoned ? WaitAfter(exchange.result, now) : NotTaken(exchange, verdict, now);
}

Pause UploadCycle::NotTaken(const Exchange& exchange, Verdict verdict, WallTime now) {
    const auto& events = exchange.batch.events;
    const bool isAboutTheBatch = verdict != Verdict::Wait;
    if (exchange.isAside && isAboutTheBatch)
        return AsideFailed(exchange, now);
    m_notifier.TellFailure({report::Cause::Upload, m_sender.Destination() + ": " + Describe(exchange.result) +
                                                       "; the events stay in the outbox"});
    const auto blame = verdict == Verdict::WaitAndHalve ? Blame::NoAnswer : Blame::Later;
    if (!exchange.isAside && isAboutTheBatch && m_sizer.Failed(exchange.Size(), blame))
        StepAside(events.front(), now);
    return WaitAfter(exchange.result, now);
}

std::string UploadCycle::Describe(const otlp::HttpResult& result) const {
    const auto lookAt = RetryPolicy::LookAt(result, m_sender.HeaderNames());
    return RetryPolicy::Describe(result) + (lookAt.empty() ? "" : "; " + lookAt);
}

/// Sets an event aside that failed alone, so that others can be sent. Does nothing when there are no others.
void UploadCycle::StepAside(const StoredEvent& event, WallTime now) {
    auto without = m_aside.Keys();
    without[event.row] = event.uuid;
    if (m_aside.IsFull() || m_outbox.Take(1, without).events.empty())
        return;
    m_aside.Add(event, now);
    m_sizer.SteppedAside();
}

Pause UploadCycle::AsideFailed(const Exchange& exchange, WallTime now) {
    const auto& event = exchange.batch.events.front();
    const auto why = RetryPolicy::Describe(exchange.result);
    const auto strikes = m_aside.Failed(event.row, now);
    if (strikes.areOut)
        MoveToDeadLetters(exchange, "not taken at " + std::to_string(strikes.count) +
                                        " tries, while others were: " + why);
    else if (strikes.isNew && strikes.count == 1)
        m_notifier.TellFailure({report::Cause::Refusal, "An event is not taken while others are, and will be "
                                                        "tried again from time to time: " +
                                                            why});
    return WaitAfter(exchange.result, now);
}

Pause UploadCycle::WaitAfter(const otlp::HttpResult& result, WallTime now) {
    return {RetryPolicy::WaitBefore(result, ++m_failures, m_random(), now, m_settings.retry),
            outbox::CountWaiter::NEVER};
}

Pause UploadCycle::Delivered(Exchange exchange) {
    const auto count = exchange.batch.events.size();
    const auto partial = RetryPolicy::ReadPartialSuccess(exchange.result, count);
    m_failures = 0;
    m_refusalsInARow = 0;
    m_aside.OtherWasTaken();
    if (exchange.isAside)
        m_aside.Remove(exchange.batch.events.front().row);
    else
        m_sizer.Taken(exchange.Size());
    m_isAsidesTurn = !exchange.isAside;
    m_removal = Removal{std::move(exchange.batch), partial.rejected};
    TellDelivery(count, partial);
    Settle();
    return AT_ONCE;
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

Pause UploadCycle::Refused(const Exchange& exchange, Blame blame, WallTime now) {
    m_failures = 0;
    if (!exchange.isAside && !m_sizer.Failed(exchange.Size(), blame))
        return AT_ONCE;
    MoveToDeadLetters(exchange, RetryPolicy::Describe(exchange.result));
    if (!exchange.isAside)
        m_sizer.Found();
    return WaitAfterRefusals(exchange.result, now);
}

void UploadCycle::MoveToDeadLetters(const Exchange& exchange, const std::string& reason) {
    const auto& event = exchange.batch.events.front();
    m_outbox.MoveToDeadLetters(event, {exchange.result.status, reason});
    m_aside.Remove(event.row);
    m_notifier.TellFailure(
        {report::Cause::Refusal, "An event was refused for good and moved to the dead letters: " + reason});
}

Pause UploadCycle::WaitAfterRefusals(const otlp::HttpResult& result, WallTime now) {
    if (++m_refusalsInARow < m_settings.retry.refusalsBeforeWaiting)
        return AT_ONCE;
    const auto failures = m_refusalsInARow - m_settings.retry.refusalsBeforeWaiting + 1;
    return {RetryPolicy::WaitBefore(result, failures, m_random(), now, m_settings.retry),
            outbox::CountWaiter::NEVER};
}

} // namespace MetrikSdk::upload
