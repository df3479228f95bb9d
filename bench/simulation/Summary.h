#pragma once

#include <optional>
#include <vector>

#include "bench/simulation/BodySizes.h"
#include "bench/simulation/Config.h"
#include "bench/simulation/Tally.h"

namespace Fleet {

/// What happened in a span of time. Rates are per second.
struct Rates {
    double stored = 0;
    double requests = 0;
    double events = 0;
    double bytes = 0;
    std::uint64_t later = 0;    ///< The count of answers with 503, not a rate.
    std::uint64_t noAnswer = 0; ///< The count of requests without an answer, not a rate.
    std::uint64_t peakRequests = 0;
    std::uint64_t peakEvents = 0;
    std::uint64_t peakBytes = 0;
    std::uint64_t waitingAtEnd = 0;
};

/// The results of a run, all computed from the tally.
struct Summary {
    Summary(const Config& config, const Tally& tally);

    std::vector<Rates> hours;
    Rates day;                  ///< The whole time.
    Rates normal;               ///< The busiest hour that neither outage nor restart touches.
    std::optional<Rates> away;  ///< During the outage.
    std::optional<Rates> after; ///< From its end until the events that waited then have left, or to the end.
    std::optional<Rates> restart; ///< The ten minutes after the restart.
    /// How long after the end of the outage half of the events that waited then had left; empty when they had
    /// not by the end of the run. The two below are the same for 99 % and for all events.
    std::optional<Tick> drainedHalf;
    std::optional<Tick> drainedMost;
    std::optional<Tick> drainedAll;
};

} // namespace Fleet
