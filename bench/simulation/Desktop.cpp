#include "bench/simulation/Desktop.h"

#include <algorithm>

namespace Fleet {

using MetrikSdk::EventKey;
using MetrikSdk::EventKeys;

/// Moves the head past events that stepped aside.
void Queue::PassBy(const EventKeys& without) {
    while (m_outbox.count > 0 && !without.empty() && without.contains(m_outbox.headRow)) {
        const bool isTaken = m_outbox.headRow < m_outbox.takenBelow;
        m_outbox.early.push_back({m_outbox.headRow, m_outbox.head.Current(), isTaken, false});
        m_outbox.head.Advance(m_config, m_id);
        ++m_outbox.headRow;
        --m_outbox.count;
    }
}

MetrikSdk::upload::QueueHead Queue::TakeOldest(std::size_t maxEvents, const EventKeys& without) {
    PassBy(without);
    m_fromEarly = 0;
    m_firstRow = m_outbox.headRow;
    auto oldest = m_outbox.head.Current();
    const bool areAllAside = m_outbox.early.size() == without.size(); // each event aside is an early one
    for (const auto& early : m_outbox.early) {
        if (areAllAside || m_fromEarly == maxEvents)
            break;
        if (without.contains(early.row))
            continue;
        if (m_fromEarly++ == 0) {
            m_firstRow = early.row;
            oldest = early.storedAt;
        }
    }
    const auto count = std::min<std::size_t>(maxEvents, m_fromEarly + m_outbox.count);
    return {count, std::min(count, m_mostFitting), WallAt(oldest)};
}

bool Queue::TakeOne(const EventKey& key) {
    m_firstRow = static_cast<std::uint32_t>(key.row);
    m_fromEarly = 1;
    return std::any_of(m_outbox.early.begin(), m_outbox.early.end(),
                       [&](const auto& early) { return early.row == key.row; });
}

bool Queue::HasOthersThan(const EventKeys& these) {
    return TakeOldest(1, these).count > 0;
}

} // namespace Fleet
