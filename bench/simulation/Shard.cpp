#include "bench/simulation/Shard.h"

#include <algorithm>

namespace Fleet {

using MetrikSdk::upload::UploadRules;

namespace {

/// How many events of the common size fit a request by its bytes, computed with the service's own rule.
std::size_t MostFitting(const Config& config) {
    const auto& settings = config.settings.batch;
    MetrikSdk::Batch full;
    full.events.resize(settings.maxEvents);
    for (auto& event : full.events)
        event.bytes = config.eventBytes;
    return MetrikSdk::upload::HeadOf(full, settings.maxEvents, settings).fitting;
}

} // namespace

Shard::Shard(const Config& config, const BodySizes& sizes, std::uint32_t first, std::uint32_t count,
             Tally& tally)
    : m_config(config), m_sizes(sizes), m_first(first), m_tally(tally), m_collector(config),
      m_wheel(config.End()), m_mostFitting(MostFitting(config)) {
    m_desktops.reserve(count);
    for (std::uint32_t i = 0; i < count; ++i) {
        const auto& desktop = m_desktops.emplace_back(config, first + i);
        for (unsigned day = 0; day < config.days; ++day) {
            const auto times = DayOf(config.seed, first + i, day);
            m_wheel.Add({times.start, i, SwitchOn});
            m_wheel.Add({times.end, i, SwitchOff});
        }
        m_wheel.Add({desktop.coming.Current(), i, StoreEvent});
        m_wheel.Add({config.restartAt, i, Restart});
    }
    m_wheel.Add({config.outageTo, 0, OutageEnds});
}

void Shard::Run() {
    m_wheel.Run([this](const Happening& happening) { Handle(happening); });
    CountAtEnd();
}

void Shard::Handle(const Happening& happening) {
    const std::uint32_t index = happening.desktop;
    const Scene scene{index, m_first + index, m_desktops[index], happening.at};
    auto& desktop = scene.desktop;
    switch (happening.kind) {
    case SwitchOn:
        return StartService(scene);
    case SwitchOff:
        return StopService(scene);
    case Restart:
        if (desktop.rules) {
            StopService(scene);
            StartService(scene);
        }
        return;
    case StoreEvent:
        return Store(scene);
    case Wake:
        if (desktop.wakeAt == scene.now)
            Pass(scene);
        return;
    case Answer:
        if (desktop.flight.answerAt == scene.now)
            Answered(scene);
        return;
    case OutageEnds:
        for (const auto& each : m_desktops)
            m_tally.backlog += each.outbox.Waiting();
        return;
    default:
        return;
    }
}

void Shard::StartService(const Scene& scene) {
    auto& desktop = scene.desktop;
    desktop.rules.emplace(m_config.settings);
    desktop.caps.FileOpened(WallAt(scene.now), SteadyAt(scene.now));
    const auto wait =
        MetrikSdk::upload::RetryPolicy::WaitAtStart(desktop.random.Uniform(), m_config.settings.retry);
    PauseFor(scene, {wait});
}

/// The request under way gets no answer any more. The waiting events stay in the outbox file.
void Shard::StopService(const Scene& scene) {
    auto& desktop = scene.desktop;
    desktop.rules.reset();
    desktop.flight.answerAt = NEVER;
    desktop.wakeAt = NEVER;
}

void Shard::Store(const Scene& scene) {
    auto& desktop = scene.desktop;
    ++desktop.outbox.count;
    ++m_tally.stored;
    ++m_tally.At(scene.now).stored;
    desktop.coming.Advance(m_config, scene.id);
    Add(scene, desktop.coming.Current(), StoreEvent);
    if (!desktop.rules)
        return;
    KeepWithinCaps(scene);
    const auto waiting = static_cast<std::int64_t>(desktop.outbox.Waiting());
    if (desktop.flight.answerAt == NEVER && waiting >= desktop.untilWaiting)
        Pass(scene);
}

/// Does nothing while a request is under way, because its events must not be dropped. The next event that is
/// stored calls this again.
void Shard::KeepWithinCaps(const Scene& scene) {
    auto& desktop = scene.desktop;
    const auto steady = SteadyAt(scene.now);
    const auto bytes = static_cast<std::int64_t>(desktop.outbox.Waiting() * m_config.eventBytes);
    if (desktop.flight.answerAt != NEVER || !desktop.caps.IsDue(bytes, steady))
        return;
    const auto dropped = DropOldest(scene, desktop.caps.Look(bytes, WallAt(scene.now), steady));
    desktop.caps.Dropped(dropped, steady);
    if (dropped == 0)
        return;
    if (!desktop.drops)
        desktop.drops = std::make_unique<MetrikSdk::report::LossRun>(m_config.settings.caps.dropRunEnds);
    desktop.drops->TakeEnded(steady);
    if (desktop.drops->Add("A759", dropped, steady, WallAt(scene.now)))
        ++m_tally.dropRuns;
}

std::size_t Shard::DropOldest(const Scene& scene, const MetrikSdk::outbox::CapWatch::Order& order) {
    auto& outbox = scene.desktop.outbox;
    std::size_t dropped = 0;
    const auto isDoomed = [&](Tick storedAt) {
        const auto freed = static_cast<std::int64_t>(dropped * m_config.eventBytes);
        return dropped < order.maxEvents && (WallAt(storedAt) < order.before || freed < order.excessBytes);
    };
    auto early = outbox.early.begin();
    for (; early != outbox.early.end() && isDoomed(early->storedAt); ++early, ++dropped)
        CountLeft(scene, early->storedAt, early->isTaken, false);
    outbox.early.erase(outbox.early.begin(), early);
    for (; outbox.early.empty() && outbox.count > 0 && isDoomed(outbox.head.Current()); ++dropped)
        PopHead(scene, false);
    m_tally.dropped += dropped;
    return dropped;
}

void Shard::Pass(const Scene& scene) {
    auto queue = QueueOf(scene);
    const auto next = scene.desktop.rules->WhatNext(queue, WallAt(scene.now));
    if (next.count == 0)
        PauseFor(scene, next.pause);
    else
        Send(scene, queue, next);
}

/// The service looks for events from time to time also when nothing waits. The simulation leaves these looks
/// out, because they change nothing.
void Shard::PauseFor(const Scene& scene, const MetrikSdk::upload::Pause& pause) {
    auto& desktop = scene.desktop;
    const auto duration = std::max<std::int64_t>(1, pause.duration.count());
    desktop.untilWaiting = pause.untilWaiting;
    const bool isIdle = pause.untilWaiting == 1 && desktop.outbox.Waiting() == 0;
    desktop.wakeAt = isIdle ? NEVER : static_cast<Tick>(std::min<std::int64_t>(scene.now + duration, NEVER));
    Add(scene, desktop.wakeAt, Wake);
}

void Shard::Send(const Scene& scene, const Queue& queue, const UploadRules::Next& next) {
    auto& desktop = scene.desktop;
    auto count = next.count;
    while (const auto fitting = desktop.rules->Fitting({count, m_sizes.Of(count).plain})) {
        if (fitting == count)
            break;
        count = fitting;
    }
    const auto fromEarly = std::min<std::uint32_t>(queue.FromEarly(), static_cast<std::uint32_t>(count));
    desktop.wakeAt = NEVER;
    desktop.flight = {scene.now,
                      0,
                      m_collector.Post(scene.now, count),
                      static_cast<std::uint32_t>(count) - fromEarly,
                      queue.FirstRow(),
                      static_cast<std::uint32_t>(count),
                      next.isAside};
    MarkSent(scene, fromEarly);
    desktop.flight.answerAt = desktop.flight.answer.at;
    auto& second = m_tally.At(scene.now);
    ++second.requests;
    second.bytes += m_sizes.Of(count).sent;
    m_tally.triedAlone += next.isAside ? 1U : 0U;
    NoteTaken(scene);
    Add(scene, desktop.flight.answerAt, Answer);
}

void Shard::MarkSent(const Scene& scene, std::uint32_t fromEarly) {
    const auto& flight = scene.desktop.flight;
    for (auto& early : scene.desktop.outbox.early) {
        early.isSent = fromEarly > 0 && (flight.isAside ? early.row == flight.firstRow
                                                        : !scene.desktop.rules->Aside().contains(early.row));
        fromEarly -= early.isSent ? 1U : 0U;
    }
}

/// Counts what the collector stores of the request. The desktop gets the answer later, or never.
void Shard::NoteTaken(const Scene& scene) {
    auto& outbox = scene.desktop.outbox;
    const auto& flight = scene.desktop.flight;
    auto& second = m_tally.At(scene.now);
    if (!flight.answer.isTaken) {
        (flight.answer.kind == Collector::Kind::Later || flight.answer.kind == Collector::Kind::Away503
             ? second.later
             : second.noAnswer) += 1;
        return;
    }
    second.noAnswer += flight.answer.kind == Collector::Kind::Taken ? 0U : 1U;
    second.events += flight.count;
    m_tally.taken += flight.count;
    for (auto& early : outbox.early) {
        m_tally.duplicates += early.isSent && early.isTaken ? 1U : 0U;
        early.isTaken = early.isTaken || early.isSent;
    }
    const auto end = outbox.headRow + flight.fromRange;
    const auto known = std::clamp(outbox.takenBelow, outbox.headRow, end);
    m_tally.duplicates += known - outbox.headRow;
    outbox.takenBelow = std::max(outbox.takenBelow, end);
}

void Shard::Answered(const Scene& scene) {
    auto& desktop = scene.desktop;
    const auto flight = desktop.flight;
    const auto sent = SentBy(desktop);
    auto queue = QueueOf(scene);
    const auto decision = desktop.rules->Answered(sent, m_collector.ResultOf(flight.answer.kind),
                                                  desktop.random.Uniform(), WallAt(flight.sentAt), queue);
    desktop.flight.answerAt = NEVER;
    switch (decision.outcome) {
    case UploadRules::Outcome::Taken:
        Leave(scene, true);
        break;
    case UploadRules::Outcome::OutOfStrikes:
    case UploadRules::Outcome::Refused:
        Leave(scene, false);
        ++m_tally.deadLettered;
        desktop.rules->MovedToDeadLetters(sent);
        break;
    default:
        break;
    }
    if (decision.pause.duration.count() == 0)
        Pass(scene);
    else
        PauseFor(scene, decision.pause);
}

/// The events of the request leave the outbox.
void Shard::Leave(const Scene& scene, bool isDelivered) {
    auto& early = scene.desktop.outbox.early;
    for (const auto& event : early)
        if (event.isSent)
            CountLeft(scene, event.storedAt, event.isTaken, isDelivered);
    std::erase_if(early, [](const auto& event) { return event.isSent; });
    for (auto left = scene.desktop.flight.fromRange; left > 0; --left)
        PopHead(scene, isDelivered);
}

void Shard::PopHead(const Scene& scene, bool isDelivered) {
    auto& outbox = scene.desktop.outbox;
    CountLeft(scene, outbox.head.Current(), outbox.headRow < outbox.takenBelow, isDelivered);
    ++outbox.headRow;
    if (--outbox.count == 0)
        outbox.head = scene.desktop.coming;
    else
        outbox.head.Advance(m_config, scene.id);
}

void Shard::CountLeft(const Scene& scene, Tick storedAt, bool isTaken, bool isDelivered) {
    auto& second = m_tally.At(scene.now);
    ++second.left;
    if (scene.now >= m_config.outageTo && storedAt < m_config.outageTo)
        ++second.backlogLeft;
    m_tally.delivered += isDelivered ? 1U : 0U;
    m_tally.droppedTaken += !isDelivered && isTaken ? 1U : 0U;
}

UploadRules::Sent Shard::SentBy(const Desktop& desktop) const {
    const auto& flight = desktop.flight;
    return {{flight.count, m_sizes.Of(flight.count).plain}, flight.isAside, {flight.firstRow, {}}};
}

Queue Shard::QueueOf(const Scene& scene) const {
    return {m_config, scene.id, scene.desktop.outbox, m_mostFitting};
}

void Shard::CountAtEnd() {
    for (const auto& desktop : m_desktops) {
        const auto& outbox = desktop.outbox;
        m_tally.waiting += outbox.Waiting();
        const auto end = outbox.headRow + outbox.count;
        m_tally.unconfirmed += std::clamp(outbox.takenBelow, outbox.headRow, end) - outbox.headRow;
        for (const auto& early : outbox.early)
            m_tally.unconfirmed += early.isTaken ? 1U : 0U;
        m_tally.desktopBytes += sizeof(Desktop) + outbox.early.capacity() * sizeof(Outbox::Early);
    }
}

} // namespace Fleet
