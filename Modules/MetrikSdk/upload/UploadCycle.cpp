#include "Modules/MetrikSdk/upload/UploadCycle.h"

#include <utility>

#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"
#include "Modules/MetrikSdk/outbox/StoreError.h"
#include "Modules/MetrikSdk/upload/BatchPlan.h"
#include "Modules/MetrikSdk/upload/RetryPolicy.h"

namespace MetrikSdk::upload {
namespace {

/// An idle uploader looks again this often: events may come from another process, or the file may be back.
constexpr std::chrono::milliseconds IDLE = std::chrono::seconds(30);

constexpr Pause AT_ONCE{};

} // namespace

/// Keeps the batch from being dropped for a cap while it is under way. What was delivered and is not deleted yet
/// stays so until Settle: dropped, it would be counted as lost.
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
      m_random(std::move(random)), m_splitter(settings.batch.maxEvents) {}

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
    auto batch = m_outbox.Take(m_splitter.Limit());
    const auto plan = PlanBatch(batch, m_splitter.Limit(), now, m_settings.batch);
    if (plan.count == 0)
        return {IDLE, 1};
    if (plan.wait > std::chrono::milliseconds(0))
        return {plan.wait, static_cast<std::int64_t>(m_settings.batch.maxEvents)};
    batch.events.resize(plan.count);
    const auto result = m_sender.Post(otlp::EncodeOtlp(batch));
    return Act(std::move(batch), result, now);
}

Pause UploadCycle::Act(Batch batch, const otlp::HttpResult& result, WallTime now) {
    switch (RetryPolicy::Judge(result)) {
    case Verdict::Delete:
        return Delivered(std::move(batch), result);
    case Verdict::Halve:
        return Refused(batch, result, now);
    case Verdict::Wait:
        break;
    }
    if (!result.abandoned)
        m_notifier.TellFailure({report::Cause::Upload, m_sender.Destination() + ": " +
                                                           RetryPolicy::Describe(result) +
                                                           "; the events stay in the outbox"});
    return WaitAfter(result, now);
}

Pause UploadCycle::WaitAfter(const otlp::HttpResult& result, WallTime now) {
    return {RetryPolicy::WaitBefore(result, ++m_failures, m_random(), now, m_settings.retry),
            outbox::CountWaiter::NEVER};
}

Pause UploadCycle::Delivered(Batch batch, const otlp::HttpResult& result) {
    const auto count = batch.events.size();
    const auto partial = RetryPolicy::ReadPartialSuccess(result, count);
    m_failures = 0;
    m_refusalsInARow = 0;
    m_splitter.Gone(count);
    m_removal = Removal{std::move(batch), partial.rejected};
    if (partial.rejected > 0)
        m_notifier.TellFailure(
            {report::Cause::Refusal, "The collector rejected " + std::to_string(partial.rejected) + " of " +
                                         std::to_string(count) + " events for good: " + partial.message});
    m_notifier.TellSuccess("upload", std::to_string(count - partial.rejected) + " events");
    m_notifier.TellFailure({report::Cause::Upload, m_sender.Destination() + ": events are taken again",
                            report::News::Kind::End});
    Settle();
    return AT_ONCE;
}

void UploadCycle::Settle() {
    if (!m_removal)
        return;
    m_outbox.RemoveDelivered(m_removal->batch, m_removal->refused);
    m_removal.reset();
    m_outbox.Release();
}

Pause UploadCycle::Refused(const Batch& batch, const otlp::HttpResult& result, WallTime now) {
    m_failures = 0;
    if (!m_splitter.Refused(batch.events.size()))
        return AT_ONCE;
    return MoveToDeadLetters(batch.events.front(), result, now);
}

Pause UploadCycle::MoveToDeadLetters(const StoredEvent& event, const otlp::HttpResult& result, WallTime now) {
    m_outbox.MoveToDeadLetters(event, {result.status, RetryPolicy::Describe(result)});
    m_splitter.Found();
    m_notifier.TellFailure(
        {report::Cause::Refusal,
         "An event was refused for good and moved to the dead letters: " + RetryPolicy::Describe(result)});
    if (++m_refusalsInARow < m_settings.retry.refusalsBeforeWaiting)
        return AT_ONCE;
    const auto failures = m_refusalsInARow - m_settings.retry.refusalsBeforeWaiting + 1;
    return {RetryPolicy::WaitBefore(result, failures, m_random(), now, m_settings.retry),
            outbox::CountWaiter::NEVER};
}

} // namespace MetrikSdk::upload
