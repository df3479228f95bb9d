#pragma once

#include <cstdint>

#include "bench/simulation/Config.h"

namespace Fleet {

/// When a desktop is used. It is switched off in the night.
struct WorkingDay {
    Tick start; ///< The service starts, and the suite reports it: the day's first event.
    Tick breakFrom;
    Tick breakTo;
    Tick end;
};

/// A pure function: each day of each desktop is another one. Starts lie between 7:30 and 10:00, most at 8:45;
/// a day has 8.5 hours more or less, of which 45 minutes at noon are a break.
WorkingDay DayOf(std::uint64_t seed, std::uint32_t desktop, unsigned day);

/// The mean time in which a desktop is used on a day.
constexpr Tick USED = 8 * HOUR + 30 * MINUTE - 45 * MINUTE;

/// The times at which a desktop's events are stored, one after another: at random, at the same rate through
/// the day but for the break. A pure function of seed and desktop, so that a copy made earlier tells the same
/// times again. This is how a desktop with any number of waiting events takes the same memory.
class EventTimes {
public:
    EventTimes(const Config& config, std::uint32_t desktop);

    Tick Current() const { return m_current; }
    void Advance(const Config& config, std::uint32_t desktop);

private:
    void BeginDay(const Config& config, std::uint32_t desktop);

    Random m_random;
    Tick m_current = 0;
    Tick m_until = 0; ///< The break, or the end of the day.
    std::uint16_t m_day = 0;
    bool m_isMorning = true;
};

} // namespace Fleet
