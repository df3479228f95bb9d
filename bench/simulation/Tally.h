#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "bench/simulation/Config.h"

namespace Fleet {

/// What happened in one second.
struct Second {
    std::uint64_t bytes = 0;    ///< Of bodies as they travel.
    std::uint32_t stored = 0;   ///< Events, by the desktops.
    std::uint32_t requests = 0; ///< Tries, whatever came of them.
    std::uint32_t noAnswer = 0; ///< Those that got none.
    std::uint32_t later = 0;    ///< Those that were answered with 503.
    std::uint32_t events = 0;   ///< That collectors took.
    std::uint32_t left = 0;     ///< Events that left an outbox.
    std::uint32_t backlogLeft =
        0; ///< The same of those that were stored before the outage ended, since then.
};

/// All that is counted. Sums only, so that it does not matter who adds first.
struct Tally {
    explicit Tally(Tick end) : seconds(end / SECOND + 1) {}

    Second& At(Tick tick) { return seconds[tick / SECOND]; }
    void Add(const Tally& other);

    std::vector<Second> seconds;
    std::uint64_t stored = 0;
    std::uint64_t delivered = 0;   ///< As the desktops count.
    std::uint64_t taken = 0;       ///< As the collectors count: with those that they took again.
    std::uint64_t duplicates = 0;  ///< Events that were taken again.
    std::uint64_t unconfirmed = 0; ///< Taken, but the desktop does not know it (yet).
    std::uint64_t dropped = 0;
    std::uint64_t droppedTaken = 0; ///< Of those: had been taken before.
    std::uint64_t dropRuns = 0;     ///< Lines in a log about them.
    std::uint64_t deadLettered = 0;
    std::uint64_t waiting = 0;      ///< At the end.
    std::uint64_t backlog = 0;      ///< Waiting when the outage ended.
    std::uint64_t triedAlone = 0;   ///< Requests with an event that had stepped aside.
    std::uint64_t desktopBytes = 0; ///< Memory of the simulation.
};

} // namespace Fleet
