#include "Modules/MetrikSdk/outbox/CapWatch.h"

namespace MetrikSdk::outbox {

void CapWatch::FileOpened(WallTime wall, SteadyTime now) {
    m_openedSteady = now;
    m_openedAt = wall;
    m_clocks = PruneRule::BeginWatch(wall, now);
    m_nextAgeCheck = now;
}

CapWatch::Order CapWatch::Look(std::int64_t waitingBytes, WallTime wall, SteadyTime now) {
    return {OldestAllowed(wall, now), PruneRule::ExcessBytes(waitingBytes, m_caps), m_caps.maxDropsAtOnce};
}

WallTime CapWatch::OldestAllowed(WallTime wall, SteadyTime now) {
    m_clocks = PruneRule::LookAgain(m_clocks, wall, now);
    if (!PruneRule::MayDropByAge(m_clocks, m_caps))
        return WallTime::min();
    const auto elapsed = std::chrono::duration_cast<std::chrono::milliseconds>(now - m_openedSteady);
    return PruneRule::OldestAllowed(wall, m_openedAt, elapsed, m_caps);
}

void CapWatch::Dropped(std::size_t events, SteadyTime now) {
    if (events < m_caps.maxDropsAtOnce) // else more may be due: the next event goes on
        m_nextAgeCheck = now + m_caps.ageCheckInterval;
}

} // namespace MetrikSdk::outbox
