#include "Modules/MetrikSdk/outbox/CapKeeper.h"

#include <string>

namespace MetrikSdk::outbox {

void CapKeeper::FileOpened(OutboxStore& store, SteadyTime now) {
    Recount(store);
    const auto wall = WallNow();
    m_clocks = {now, wall, PruneRule::BeginWatch(wall, now)};
    m_nextAgeCheck = now;
}

void CapKeeper::EventStored(std::size_t bytes) {
    m_waitingBytes += static_cast<std::int64_t>(bytes);
    m_waiting.Set(++m_waitingEvents);
}

void CapKeeper::Recount(OutboxStore& store) {
    const auto status = store.Status();
    m_waitingEvents = status.waiting;
    // the events and the modules both take disk space
    m_waitingBytes = status.waitingBytes + status.moduleBytes;
    m_waiting.Set(m_waitingEvents);
}

void CapKeeper::KeepWithinCaps(OutboxStore& store, SteadyTime now, std::vector<report::News>& news) {
    TellIfOver(now, news);
    const auto excess = PruneRule::ExcessBytes(m_waitingBytes, m_caps);
    if (excess == 0 && now < m_nextAgeCheck)
        return;
    const auto maxRows = m_caps.maxDropsAtOnce;
    const auto dropped = store.DropOldest(m_underWayUpTo, OldestAllowed(now), excess, maxRows);
    Recount(store);
    if (dropped.events < maxRows) // otherwise more may be due, and the next event goes on
        m_nextAgeCheck = now + m_caps.ageCheckInterval;
    CountDrops(dropped, now, news);
}

WallTime CapKeeper::OldestAllowed(SteadyTime now) {
    const auto wall = WallNow();
    m_clocks.watch = PruneRule::LookAgain(m_clocks.watch, wall, now);
    if (!PruneRule::MayDropByAge(m_clocks.watch, m_caps))
        return WallTime::min();
    const auto elapsed = std::chrono::duration_cast<std::chrono::milliseconds>(now - m_clocks.openedSteady);
    return PruneRule::OldestAllowed(wall, m_clocks.openedAt, elapsed, m_caps);
}

void CapKeeper::CountDrops(const OutboxStore::Dropped& dropped, SteadyTime now,
                           std::vector<report::News>& news) {
    bool begins = false;
    for (const auto& [module, count] : dropped.modules)
        begins = m_drops.Add(module, count, now, WallNow()) || begins;
    if (begins)
        news.push_back({report::Cause::Drop, "The outbox is over its bounds: old events are being dropped, " +
                                                 std::to_string(dropped.events) +
                                                 " of them just now; the total is told when that is over"});
}

void CapKeeper::TellEndOfRun(const std::optional<std::string>& totals, std::vector<report::News>& news) {
    if (totals)
        news.push_back({report::Cause::Drop, "No events are dropped any more; lost: " + *totals,
                        report::News::Kind::End});
}

void CapKeeper::EndRun(std::vector<report::News>& news) {
    TellEndOfRun(m_drops.Take(), news);
}

void CapKeeper::KeepDeadLettersWithinCaps(OutboxStore& store, std::vector<report::News>& news) const {
    const auto trimmed = store.TrimDeadLetters(m_caps.maxDeadLetters, m_caps.maxDeadLetterBytes);
    if (trimmed > 0)
        news.push_back(
            {report::Cause::Drop, "The dead letters are over their bounds: the oldest were deleted, " +
                                      std::to_string(trimmed) + " of them just now"});
}

} // namespace MetrikSdk::outbox
