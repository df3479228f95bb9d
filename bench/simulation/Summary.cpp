#include "bench/simulation/Summary.h"

#include <algorithm>
#include <cmath>

namespace Fleet {
namespace {

Rates Between(const Tally& tally, Tick from, Tick to) {
    Rates rates;
    const auto first = from / SECOND;
    const auto last = std::min<std::size_t>(to / SECOND, tally.seconds.size());
    for (std::size_t i = first; i < last; ++i) {
        const auto& second = tally.seconds[i];
        rates.stored += second.stored;
        rates.requests += second.requests;
        rates.events += second.events;
        rates.bytes += static_cast<double>(second.bytes);
        rates.later += second.later;
        rates.noAnswer += second.noAnswer;
        rates.peakRequests = std::max<std::uint64_t>(rates.peakRequests, second.requests);
        rates.peakEvents = std::max<std::uint64_t>(rates.peakEvents, second.events);
        rates.peakBytes = std::max(rates.peakBytes, second.bytes);
    }
    const auto length = static_cast<double>(std::max<std::size_t>(1, last - first));
    for (auto* rate : {&rates.stored, &rates.requests, &rates.events, &rates.bytes})
        *rate /= length;
    return rates;
}

/// How long after the end of the outage this part of the backlog had left the outboxes.
std::optional<Tick> Drained(const Config& config, const Tally& tally, double part) {
    const auto wanted = static_cast<std::uint64_t>(std::ceil(static_cast<double>(tally.backlog) * part));
    std::uint64_t left = 0;
    for (std::size_t i = config.outageTo / SECOND; i < tally.seconds.size(); ++i) {
        left += tally.seconds[i].backlogLeft;
        if (left >= wanted)
            return static_cast<Tick>((i + 1) * SECOND - config.outageTo);
    }
    return std::nullopt;
}

} // namespace

Summary::Summary(const Config& config, const Tally& tally) : day(Between(tally, 0, config.End())) {
    const bool hasOutage = config.outageFrom != NEVER;
    auto drained = config.outageTo;
    if (hasOutage) {
        drainedHalf = Drained(config, tally, 0.5);
        drainedMost = Drained(config, tally, 0.99);
        drainedAll = Drained(config, tally, 1.0);
        drained = drainedAll ? config.outageTo + *drainedAll : config.End();
        away = Between(tally, config.outageFrom, config.outageTo);
        after = Between(tally, config.outageTo, drained);
    }
    if (config.restartAt != NEVER)
        restart = Between(tally, config.restartAt, config.restartAt + 10 * MINUTE);
    std::uint64_t waiting = 0;
    for (Tick from = 0; from < config.End(); from += HOUR) {
        auto hour = Between(tally, from, from + HOUR);
        for (auto i = from / SECOND; i < (from + HOUR) / SECOND; ++i)
            waiting += tally.seconds[i].stored - std::uint64_t{tally.seconds[i].left};
        hour.waitingAtEnd = waiting;
        const bool isTouched = (hasOutage && from + HOUR > config.outageFrom && from < drained) ||
                               (config.restartAt >= from && config.restartAt < from + HOUR);
        if (!isTouched && hour.requests > normal.requests)
            normal = hour;
        hours.push_back(hour);
    }
}

} // namespace Fleet
