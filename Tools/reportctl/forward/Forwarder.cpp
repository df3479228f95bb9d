#include "Tools/reportctl/forward/Forwarder.h"

#include <utility>

#include <fmt/format.h>

#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"

namespace reportctl::forward {
namespace {

using MetrikSdk::Batch;
using MetrikSdk::WallTime;
using MetrikSdk::otlp::HttpResult;
namespace upload = MetrikSdk::upload;

std::string NameOf(const MetrikSdk::StoredEvent& event) {
    return fmt::format("row {}", event.row);
}

} // namespace

Forwarder::Forwarder(RowQueue& queue, MetrikSdk::otlp::Sender& sender, Teller& teller,
                     const MetrikSdk::OutboxSettings& settings, std::function<double()> random)
    : m_queue(queue), m_sender(sender), m_teller(teller), m_settings(settings), m_random(std::move(random)),
      m_rules(m_settings) {}

Step Forwarder::Pass(WallTime now) {
    try {
        m_queue.Settle();
        const auto step = Advance(now);
        TellWhatTheQueueFound();
        return step;
    } catch (const std::exception& error) {
        TellWhatTheQueueFound();
        m_lastFailure = error.what();
        m_teller.Failure(m_lastFailure, now);
        return {Step::Kind::Trouble, m_rules.QueueFailed(m_random(), now).duration};
    }
}

Step Forwarder::Advance(WallTime now) {
    const auto next = m_rules.WhatNext(m_queue, now);
    if (next.count == 0)
        return {Step::Kind::Idle, next.pause.duration};
    return Send(m_queue.TakeBatch(next.count, now), next.isAside, now);
}

Step Forwarder::Send(Batch batch, bool isAside, WallTime now) {
    const auto body = EncodeWithinBound(batch);
    const auto& first = batch.events.front();
    const Rules::Sent sent{{batch.events.size(), body.size()}, isAside, {first.row, first.uuid}};
    const auto result = m_sender.Post(body);
    const auto decision = m_rules.Answered(sent, result, m_random(), now, m_queue);
    return {Act(batch, sent, result, decision, now), decision.pause.duration};
}

/// Leaves out the rows for which the body would be too long.
std::string Forwarder::EncodeWithinBound(Batch& batch) const {
    for (;;) {
        auto body = MetrikSdk::otlp::EncodeOtlp(batch, m_settings.resource);
        const auto fitting = m_rules.Fitting({batch.events.size(), body.size()});
        if (fitting == batch.events.size())
            return body;
        batch.events.resize(fitting);
    }
}

Step::Kind Forwarder::Act(const Batch& batch, const Rules::Sent& sent, const HttpResult& result,
                          const Rules::Decision& decision, WallTime now) {
    using Outcome = Rules::Outcome;
    switch (decision.outcome) {
    case Outcome::Taken:
        Taken(batch, result);
        return Step::Kind::Taken;
    case Outcome::Refused:
        Refuse(batch, sent, result.status, upload::RetryPolicy::Describe(result));
        return Step::Kind::Refused;
    case Outcome::OutOfStrikes:
    case Outcome::StaysAside:
        StaysAside(batch, sent, result, decision);
        return Step::Kind::Searching;
    case Outcome::NotNow:
        NotTaken(batch, result, now);
        break;
    case Outcome::Halved:
    case Outcome::Abandoned:
        break;
    }
    return upload::RetryPolicy::Judge(result) == upload::Verdict::Wait ? Step::Kind::Unreachable
                                                                       : Step::Kind::Searching;
}

void Forwarder::Taken(const Batch& batch, const HttpResult& result) {
    const auto partial = upload::RetryPolicy::ReadPartialSuccess(result, batch.events.size());
    m_lastFailure.clear();
    m_teller.Over(m_sender.Destination() + ": rows are taken again");
    if (partial.rejected > 0)
        m_teller.Note(fmt::format("The collector rejected {} of the {} rows from {} to {} for good: {}",
                                  partial.rejected, batch.events.size(), batch.events.front().row,
                                  batch.events.back().row, partial.message));
    else if (!partial.message.empty() || !partial.impossible.empty())
        m_teller.Note(fmt::format("The collector took {} rows and says: {}{}", batch.events.size(),
                                  partial.impossible.empty() ? "" : "rejected " + partial.impossible + ", ",
                                  partial.message));
    m_done.sent += static_cast<std::int64_t>(batch.events.size() - partial.rejected);
    m_done.refused += static_cast<std::int64_t>(partial.rejected);
    m_queue.Taken(batch, static_cast<std::int64_t>(partial.rejected), partial.message);
}

void Forwarder::Refuse(const Batch& batch, const Rules::Sent& sent, long status, const std::string& reason) {
    m_teller.Note(fmt::format("{} was refused for good: {}", NameOf(batch.events.front()), reason));
    ++m_done.refused;
    m_rules.MovedToDeadLetters(sent);
    m_queue.Refused(batch, status, reason);
}

void Forwarder::NotTaken(const Batch& batch, const HttpResult& result, WallTime now) {
    m_lastFailure = m_sender.Destination() + ": " + Describe(result);
    m_teller.Failure(m_lastFailure + "; the rows wait", now);
    if (batch.events.size() == 1 && upload::RetryPolicy::Judge(result) != upload::Verdict::Wait)
        m_queue.Failed(batch, false, upload::RetryPolicy::Describe(result));
}

void Forwarder::StaysAside(const Batch& batch, const Rules::Sent& sent, const HttpResult& result,
                           const Rules::Decision& decision) {
    const auto why = upload::RetryPolicy::Describe(result);
    const auto tries = m_queue.Failed(batch, decision.strikes.isNew, why);
    if (decision.strikes.areOut || tries >= m_settings.aside.tries)
        Refuse(batch, sent, result.status,
               fmt::format("not taken at {} tries, while others were: {}", tries, why));
    else if (decision.strikes.isNew && tries == 1)
        m_teller.Note(
            fmt::format("{} is not taken while others are, and will be tried again from time to time: {}",
                        NameOf(batch.events.front()), why));
}

void Forwarder::EndRun() {
    if (m_done.sent > 0)
        m_queue.EndRun(m_settings.aside.tries);
    TellWhatTheQueueFound();
}

void Forwarder::TellWhatTheQueueFound() {
    if (m_queue.TakeRestart())
        m_teller.Note(
            "The store is another one now, or its ids began again: what is not known as sent is sent "
            "from its beginning. A repeated row has its old uid.");
    for (const auto& lost : m_queue.TakeLost()) {
        m_teller.Note(fmt::format("row {} will not be sent: {}", lost.first, lost.reason));
        ++m_done.refused;
    }
}

std::string Forwarder::Describe(const HttpResult& result) const {
    const auto lookAt = upload::RetryPolicy::LookAt(result, m_sender.HeaderNames(), m_sender.Variables());
    return upload::RetryPolicy::Describe(result) + (lookAt.empty() ? "" : "; " + lookAt);
}

} // namespace reportctl::forward
