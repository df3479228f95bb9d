#pragma once

#include <cstdint>

#include "bench/simulation/Config.h"

namespace Fleet {

/// When a desktop is used. It is switched off in the night.
struct WorkingDay {
    Tick start; ///< The service starts, and the suite reports this as the day's first event.
    Tick breakFrom;
    Tick breakTo;
    Tick end;
};

/// Each day of each desktop has its own times. Starts are between 7:30 and 10:00, most often at 8:45. A day
/// has 8.5 hours on average, of which 45 minutes at noon are a break. Pure.
WorkingDay DayOf(std::uint64_t seed, std::uint32_t desktop, unsigned day);

/// How long a desktop is used on a day, on average.
constexpr Tick USED = 8 * HOUR + 30 * MINUTE - 45 * MINUTE;

/// The times at which a desktop's events are stored, one after another. They are random, with the same rate
/// throughout the day and none in the break. They depend only on the seed and the desktop, so a copy gives
/// the same times again. An outbox keeps such a copy at its oldest event, and needs no list of times.
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
