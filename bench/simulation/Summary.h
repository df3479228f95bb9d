#pragma once

#include <optional>
#include <vector>

#include "bench/simulation/BodySizes.h"
#include "bench/simulation/Config.h"
#include "bench/simulation/Tally.h"

namespace Fleet {

/// Rates over a time, each a second.
struct Rates {
    double stored = 0;
    double requests = 0;
    double events = 0;
    double bytes = 0;
    std::uint64_t later = 0;    ///< Answers, not a rate.
    std::uint64_t noAnswer = 0; ///< Requests, not a rate.
    std::uint64_t peakRequests = 0;
    std::uint64_t peakEvents = 0;
    std::uint64_t peakBytes = 0;
    std::uint64_t waitingAtEnd = 0;
};

/// What a run says, all computed from the tally.
struct Summary {
    Summary(const Config& config, const Tally& tally);

    std::vector<Rates> hours;
    Rates day;                    ///< The whole time.
    Rates normal;                 ///< The busiest hour that the outage does not touch.
    std::optional<Rates> away;    ///< During the outage.
    std::optional<Rates> after;   ///< From its end until all that waited then has left, or to the end.
    std::optional<Rates> restart; ///< The ten minutes after the restart.
    std::optional<Tick> drainedHalf;
    std::optional<Tick> drainedMost; ///< 99 of 100 events.
    std::optional<Tick> drainedAll;  ///< Since the end of the outage; nothing: not by the end of the run.
};

} // namespace Fleet
