#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/outbox/CountWaiter.h"
#include "Modules/MetrikSdk/outbox/OutboxStore.h"
#include "Modules/MetrikSdk/outbox/PruneRule.h"
#include "Modules/MetrikSdk/report/LossRun.h"
#include "Modules/MetrikSdk/report/News.h"

namespace MetrikSdk::outbox {

/// Keeps an outbox within its caps: knows how much waits, looks for what is too much or too old, and drops
/// it. The rules are PruneRule's; here is when to look, and what was seen of the clocks since the file was
/// opened.
///
/// Threads: one at a time. Failure: throws StoreError.
class CapKeeper {
public:
    /// `waiting` is told how many events wait. It outlives this object.
    CapKeeper(const CapSettings& caps, CountWaiter& waiting)
        : m_caps(caps), m_waiting(waiting), m_drops(caps.dropRunEnds) {}

    /// Another file is open now: what was known of the one before is no longer true.
    void FileOpened(OutboxStore& store, SteadyTime now);

    /// An event of so many bytes was stored.
    void EventStored(std::size_t bytes);

    /// Asks the file how much waits, after a change that the caller did not count.
    void Recount(OutboxStore& store);

    /// Drops the oldest events that are too much, and those that are too old, if it is time to look for
    /// those. Appends what is to be told.
    void KeepWithinCaps(OutboxStore& store, SteadyTime now, std::vector<report::News>& news);

    /// Tells the totals of a run of drops that is over.
    void TellIfOver(SteadyTime now, std::vector<report::News>& news) {
        TellEndOfRun(m_drops.TakeEnded(now), news);
    }

    /// Tells the totals of a run of drops now, because nothing can be told later.
    void EndRun(std::vector<report::News>& news);

    /// Drops the oldest of the events that were refused for good.
    void KeepDeadLettersWithinCaps(OutboxStore& store, std::vector<report::News>& news) const;

    /// Events up to this row are under way to the collector, and are not dropped; 0: none.
    void SetUnderWay(std::int64_t lastRow) { m_underWayUpTo = lastRow; }

private:
    /// What was seen of both clocks since the file was opened.
    struct Clocks {
        SteadyTime openedSteady{};
        WallTime openedAt{};
        PruneRule::ClockWatch watch;
    };

    WallTime OldestAllowed(SteadyTime now);
    void CountDrops(const OutboxStore::Dropped& dropped, SteadyTime now, std::vector<report::News>& news);
    static void TellEndOfRun(const std::optional<std::string>& totals, std::vector<report::News>& news);

    const CapSettings m_caps;
    CountWaiter& m_waiting;
    std::int64_t m_waitingEvents = 0;
    std::int64_t m_waitingBytes = 0;
    std::int64_t m_underWayUpTo = 0;
    Clocks m_clocks;
    SteadyTime m_nextAgeCheck{};
    report::LossRun m_drops;
};

} // namespace MetrikSdk::outbox
