#include "Modules/MetrikSdk/outbox/CapKeeper.h"

#include <string>

namespace MetrikSdk::outbox {

void CapKeeper::FileOpened(OutboxStore& store, SteadyTime now) {
    Recount(store);
    m_watch.FileOpened(WallNow(), now);
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
    if (!m_watch.IsDue(m_waitingBytes, now))
        return;
    const auto order = m_watch.Look(m_waitingBytes, WallNow(), now);
    const auto dropped = store.DropOldest(m_underWayUpTo, order.before, order.excessBytes, order.maxEvents);
    Recount(store);
    m_watch.Dropped(dropped.events, now);
    CountDrops(dropped, now, news);
}

void CapKeeper::CountDrops(const OutboxStore::Dropped& dropped, SteadyTime now,
                           std::vector<report::News>& news) {
    bool begins = false;
    for (const auto& [module, count] : dropped.modules)
        begins = m_drops.Add(module, count, now, WallNow()) || begins;
    if (begins)
        news.push_back({report::Cause::Drop, "The outbox is over its bounds: old events are being dropped, " +
                                                 std::to_string(dropped.events) +
                                                 " of them just now; the total is logged when that is over"});
}

void CapKeeper::TellEndOfRun(const std::optional<std::string>& totals, std::vector<report::News>& news) {
    if (totals)
        news.push_back({report::Cause::Drop, "No events are dropped any more; lost: " + *totals,
                        report::News::Kind::Totals});
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
