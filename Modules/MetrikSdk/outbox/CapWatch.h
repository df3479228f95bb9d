#pragma once

#include <cstddef>
#include <cstdint>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/Time.h"
#include "Modules/MetrikSdk/outbox/PruneRule.h"

namespace MetrikSdk::outbox {

/// When an outbox looks for events that are too much or too old, and what it drops then. The rules are
/// PruneRule's; here is what was seen of the clocks since the file was opened. Pure: the times are the
/// caller's. Threads: one at a time.
class CapWatch {
public:
    /// The settings outlive this object.
    explicit CapWatch(const CapSettings& caps) : m_caps(caps) {}

    /// Another file is open now: what was known of the one before is no longer true.
    void FileOpened(WallTime wall, SteadyTime now);

    /// Whether it is time to look. To be asked at each event, so it costs two comparisons.
    bool IsDue(std::int64_t waitingBytes, SteadyTime now) const {
        return now >= m_nextAgeCheck || PruneRule::ExcessBytes(waitingBytes, m_caps) > 0;
    }

    /// What is to be dropped.
    struct Order {
        WallTime before{};            ///< Events that were stored before this.
        std::int64_t excessBytes = 0; ///< Then the oldest, until so many bytes are gone.
        std::size_t maxEvents = 0;    ///< Altogether.
    };
    Order Look(std::int64_t waitingBytes, WallTime wall, SteadyTime now);

    /// So many were dropped.
    void Dropped(std::size_t events, SteadyTime now);

private:
    WallTime OldestAllowed(WallTime wall, SteadyTime now);

    const CapSettings& m_caps;
    SteadyTime m_openedSteady{};
    WallTime m_openedAt{};
    PruneRule::ClockWatch m_clocks;
    SteadyTime m_nextAgeCheck{};
};

} // namespace MetrikSdk::outbox
