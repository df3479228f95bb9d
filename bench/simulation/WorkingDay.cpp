#include "bench/simulation/WorkingDay.h"

#include <cmath>

namespace Fleet {
namespace {

constexpr std::uint32_t PURPOSE_EVENTS = 1;
constexpr std::uint32_t PURPOSE_DAYS = 1000; ///< Plus the number of the day.

Tick Part(double of, double random) {
    return static_cast<Tick>(of * random);
}

} // namespace

WorkingDay DayOf(std::uint64_t seed, std::uint32_t desktop, unsigned day) {
    auto random = RandomFor(seed, desktop, PURPOSE_DAYS + day);
    const auto early = random.Uniform();
    const auto start = day * DAY + 7 * HOUR + 30 * MINUTE + Part(75 * MINUTE, early + random.Uniform());
    const auto breakFrom = start + 3 * HOUR + 15 * MINUTE + Part(HOUR, random.Uniform());
    const auto end = start + 8 * HOUR + Part(HOUR, random.Uniform());
    return {start, breakFrom, breakFrom + 45 * MINUTE, end};
}

EventTimes::EventTimes(const Config& config, std::uint32_t desktop)
    : m_random(RandomFor(config.seed, desktop, PURPOSE_EVENTS)) {
    BeginDay(config, desktop);
}

void EventTimes::BeginDay(const Config& config, std::uint32_t desktop) {
    const auto day = DayOf(config.seed, desktop, m_day);
    m_current = day.start;
    m_until = day.breakFrom;
    m_isMorning = true;
}

void EventTimes::Advance(const Config& config, std::uint32_t desktop) {
    const auto gap = USED / (config.eventsPerDay - 1); // one is the start's own
    auto next = m_current - std::log(1.0 - m_random.Uniform()) * gap;
    if (m_current < config.restartAt && config.restartAt < m_until && config.restartAt < next) {
        m_current = config.restartAt;
        return;
    }
    if (next > m_until && m_isMorning) {
        const auto day = DayOf(config.seed, desktop, m_day);
        next += day.breakTo - day.breakFrom;
        m_until = day.end;
        m_isMorning = false;
    }
    if (next <= m_until) {
        m_current = static_cast<Tick>(next);
        return;
    }
    ++m_day;
    BeginDay(config, desktop);
}

} // namespace Fleet
