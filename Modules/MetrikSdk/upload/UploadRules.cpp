#include "Modules/MetrikSdk/upload/UploadRules.h"

#include <algorithm>

namespace MetrikSdk::upload {
namespace {

/// An idle uploader looks again this often: events may come from another process, or the file may be back.
constexpr std::chrono::milliseconds IDLE = std::chrono::seconds(30);

constexpr Pause AT_ONCE{};

} // namespace

UploadRules::Next UploadRules::WhatNext(EventQueue& queue, WallTime now) {
    if (m_isAsidesTurn && TakeAside(queue, now))
        return {1, true, AT_ONCE};
    const auto most = m_sizer.MaxEvents();
    const auto plan = PlanBatch(queue.TakeOldest(most, m_aside.Keys()), most, now, m_settings.batch);
    if (plan.count == 0)
        return TakeAside(queue, now) ? Next{1, true, AT_ONCE} : Next{0, false, Idle(now)};
    if (plan.wait > std::chrono::milliseconds(0))
        return {0,
                false,
                {plan.wait, static_cast<std::int64_t>(m_settings.batch.maxEvents + m_aside.Keys().size())}};
    return {plan.count, false, AT_ONCE};
}

/// Takes the event that is aside and due, if there is one.
bool UploadRules::TakeAside(EventQueue& queue, WallTime now) {
    while (const auto due = m_aside.Due(now)) {
        if (queue.TakeOne(*due)) {
            m_isAsidesTurn = false;
            return true;
        }
        m_aside.Remove(due->row); // a cap dropped it, or the file is another one
    }
    return false;
}

Pause UploadRules::Idle(WallTime now) const {
    return {std::min(IDLE, m_aside.UntilDue(now).value_or(IDLE)),
            static_cast<std::int64_t>(m_aside.Keys().size() + 1)};
}

std::size_t UploadRules::Fitting(const RequestSize& encoded) const {
    if (encoded.bodyBytes <= m_sizer.MaxBodyBytes() || encoded.events <= 1)
        return encoded.events;
    return std::max<std::size_t>(1, encoded.events * m_sizer.MaxBodyBytes() / encoded.bodyBytes);
}

UploadRules::Decision UploadRules::Answered(const Sent& sent, const otlp::HttpResult& result, double random,
                                            WallTime now, EventQueue& queue) {
    auto decision = Decide(sent, result, random, now, queue);
    const auto wished = RetryPolicy::WishedWait(result, random, now, m_settings.retry);
    if (wished > decision.pause.duration)
        decision.pause = Pause{wished};
    return decision;
}

UploadRules::Decision UploadRules::Decide(const Sent& sent, const otlp::HttpResult& result, double random,
                                          WallTime now, EventQueue& queue) {
    const auto verdict = RetryPolicy::Judge(result);
    Decision decision;
    switch (verdict) {
    case Verdict::Delete:
        Taken(sent);
        return {Outcome::Taken, {}, AT_ONCE};
    case Verdict::Halve:
    case Verdict::HalveForSize:
        decision.outcome = Refused(sent, verdict == Verdict::Halve ? Blame::Event : Blame::TooLarge);
        if (decision.outcome == Outcome::Refused)
            decision.pause = WaitAfterRefusals(result, random, now);
        return decision;
    case Verdict::Wait:
    case Verdict::WaitAndHalve:
    case Verdict::WaitThenHalve:
        if (result.abandoned)
            decision.outcome = Outcome::Abandoned;
        else if (!sent.isAside)
            NotTaken(sent, verdict, now, queue);
        else if (verdict != Verdict::Wait)
            decision = AsideFailed(sent, now);
        decision.pause = WaitAfter(result, random, now);
        break;
    }
    return decision;
}

void UploadRules::Taken(const Sent& sent) {
    m_failures = 0;
    m_refusalsInARow = 0;
    m_isAsidesTurn = !sent.isAside;
    if (sent.isAside)
        return m_aside.Taken(sent.first.row);
    m_aside.OtherWasTaken();
    m_sizer.Taken(sent.size);
}

void UploadRules::NotTaken(const Sent& sent, Verdict verdict, WallTime now, EventQueue& queue) {
    m_aside.OtherFailed();
    const auto blame = verdict == Verdict::WaitAndHalve ? Blame::NoAnswer : Blame::Later;
    if (verdict != Verdict::Wait && m_sizer.Failed(sent.size, blame))
        StepAside(sent.first, now, queue);
}

/// Lets the others go past an event that failed alone. If there are no others, the events that are aside take
/// turns with it: one of them may be taken.
void UploadRules::StepAside(const EventKey& event, WallTime now, EventQueue& queue) {
    m_aside.Add(event, now);
    if (queue.HasOthersThan(m_aside.Keys()))
        return m_sizer.SteppedAside();
    m_aside.Remove(event.row);
    m_isAsidesTurn = true;
}

UploadRules::Decision UploadRules::AsideFailed(const Sent& sent, WallTime now) {
    const auto strikes = m_aside.Failed(sent.first.row, now);
    return {strikes.areOut ? Outcome::OutOfStrikes : Outcome::StaysAside, strikes, AT_ONCE};
}

UploadRules::Outcome UploadRules::Refused(const Sent& sent, Blame blame) {
    m_failures = 0;
    return sent.isAside || m_sizer.Failed(sent.size, blame) ? Outcome::Refused : Outcome::Halved;
}

void UploadRules::MovedToDeadLetters(const Sent& sent) {
    m_aside.Remove(sent.first.row);
    // What had stepped aside is no part of a search.
    if (!sent.isAside)
        m_sizer.Found();
}

Pause UploadRules::QueueFailed(double random, WallTime now) {
    return WaitAfter({}, random, now);
}

Pause UploadRules::WaitAfter(const otlp::HttpResult& result, double random, WallTime now) {
    return {RetryPolicy::WaitBefore(result, ++m_failures, random, now, m_settings.retry)};
}

Pause UploadRules::WaitAfterRefusals(const otlp::HttpResult& result, double random, WallTime now) {
    if (++m_refusalsInARow < m_settings.retry.refusalsBeforeWaiting)
        return AT_ONCE;
    const auto failures = m_refusalsInARow - m_settings.retry.refusalsBeforeWaiting + 1;
    return {RetryPolicy::WaitBefore(result, failures, random, now, m_settings.retry)};
}

} // namespace MetrikSdk::upload
