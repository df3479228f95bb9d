#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/outbox/CapWatch.h"
#include "Modules/MetrikSdk/outbox/CountWaiter.h"
#include "Modules/MetrikSdk/outbox/OutboxStore.h"
#include "Modules/MetrikSdk/report/LossRun.h"
#include "Modules/MetrikSdk/report/News.h"

namespace MetrikSdk::outbox {

/// Keeps an outbox within its caps: knows how much waits, drops what is too much or too old, and tells.
/// When to look, and what for, is CapWatch's.
///
/// Threads: one at a time. Failure: throws StoreError.
class CapKeeper {
public:
    /// `waiting` gets the number of waiting events. It must outlive this object.
    CapKeeper(const CapSettings& caps, CountWaiter& waiting)
        : m_caps(caps), m_waiting(waiting), m_watch(m_caps), m_drops(caps.dropRunEnds) {}

    /// Call this when another file was opened: what is known about the old file is no longer true.
    void FileOpened(OutboxStore& store, SteadyTime now);

    /// An event that counts `bytes` was stored.
    void EventStored(std::size_t bytes);

    /// Asks the file how much waits. Call this after a change that this object has not counted.
    void Recount(OutboxStore& store);

    /// Drops the oldest events while there are too many bytes. Also drops events that are too old, when it is
    /// time to look for them. Appends the messages to `news`.
    void KeepWithinCaps(OutboxStore& store, SteadyTime now, std::vector<report::News>& news);

    /// Appends the totals of a run of drops that is over.
    void TellIfOver(SteadyTime now, std::vector<report::News>& news) {
        TellEndOfRun(m_drops.TakeEnded(now), news);
    }

    /// Appends the totals of the run of drops now, because nothing can be reported later.
    void EndRun(std::vector<report::News>& news);

    /// Drops the oldest of the events that were refused for good, when there are too many.
    void KeepDeadLettersWithinCaps(OutboxStore& store, std::vector<report::News>& news) const;

    /// Events up to this row are being sent to the collector, and are not dropped. 0 means none.
    void SetUnderWay(std::int64_t lastRow) { m_underWayUpTo = lastRow; }

private:
    void CountDrops(const OutboxStore::Dropped& dropped, SteadyTime now, std::vector<report::News>& news);
    static void TellEndOfRun(const std::optional<std::string>& totals, std::vector<report::News>& news);

    const CapSettings m_caps;
    CountWaiter& m_waiting;
    std::int64_t m_waitingEvents = 0;
    std::int64_t m_waitingBytes = 0;
    std::int64_t m_underWayUpTo = 0;
    CapWatch m_watch;
    report::LossRun m_drops;
};

} // namespace MetrikSdk::outbox
