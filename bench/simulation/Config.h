#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <string>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/Time.h"

namespace Fleet {

/// Milliseconds of simulated time since the first midnight. Enough for 49 days.
using Tick = std::uint32_t;
constexpr Tick NEVER = std::numeric_limits<Tick>::max();
constexpr Tick SECOND = 1000;
constexpr Tick MINUTE = 60 * SECOND;
constexpr Tick HOUR = 60 * MINUTE;
constexpr Tick DAY = 24 * HOUR;

/// The same time in the forms that the rules read. The date of the first midnight has no meaning.
inline MetrikSdk::WallTime WallAt(Tick tick) {
    return MetrikSdk::WallTime(std::chrono::days(20'780)) + std::chrono::milliseconds(tick);
}
inline MetrikSdk::SteadyTime SteadyAt(Tick tick) {
    return MetrikSdk::SteadyTime(std::chrono::days(1)) + std::chrono::milliseconds(tick);
}

/// What a desktop sees of a collector that is away.
enum class Away {
    Refused,    ///< No connection.
    Answers503, ///< A balancer with nothing behind it.
    Silent      ///< The request goes out, and nothing comes back.
};

/// What is simulated: the options of the command line, with their defaults.
struct Config {
    std::uint64_t seed = 1;
    unsigned desktops = 100'000;
    unsigned days = 1;
    double eventsPerDay = 200; ///< Of one desktop.

    /// Collectors behind a balancer. A desktop's connection stays with one, so they have nothing in common.
    unsigned collectors = 0;   ///< 0: as many as suit the desktops.
    double capacity = 0;       ///< Events a second of all collectors; 0: no bound.
    double returnCapacity = 0; ///< The same after the outage.
    Tick queue = 2 * SECOND;   ///< The work that fits a collector's queue; it answers 503 to more.
    unsigned retryAfter = 0;   ///< The Retry-After of these 503, in seconds; 0: they have none.

    Tick outageFrom = NEVER;
    Tick outageTo = NEVER;
    Away away = Away::Refused;
    bool isAnnounced = false; ///< The 503 of a collector that is away says by a Retry-After when it returns.
    Tick restartAt = NEVER;   ///< When all services that run are restarted.

    Tick roundTrip = 100;
    Tick timeout = 10 * SECOND; ///< OTEL_EXPORTER_OTLP_TIMEOUT

    std::size_t eventBytes = 0; ///< What the outbox counts for one event; measured at the start.
    MetrikSdk::OutboxSettings settings;

    Tick End() const { return days * DAY; }
};

/// A small generator of random numbers: one word of state, so that a million desktops can have one each.
class Random {
public:
    explicit Random(std::uint64_t state) : m_state(state) {}

    std::uint64_t Next() {
        auto z = (m_state += 0x9e3779b97f4a7c15U);
        z = (z ^ (z >> 30U)) * 0xbf58476d1ce4e5b9U;
        z = (z ^ (z >> 27U)) * 0x94d049bb133111ebU;
        return z ^ (z >> 31U);
    }

    /// In [0, 1).
    double Uniform() { return static_cast<double>(Next() >> 11U) * 0x1p-53; }

private:
    std::uint64_t m_state;
};

/// The generator of one desktop for one purpose, so that its numbers do not depend on other desktops.
inline Random RandomFor(std::uint64_t seed, std::uint32_t desktop, std::uint32_t purpose) {
    Random mixed(seed ^ (std::uint64_t{desktop} << 32U) ^ purpose);
    return Random(mixed.Next());
}

} // namespace Fleet
