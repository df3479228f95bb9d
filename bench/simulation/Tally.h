#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "bench/simulation/Config.h"

namespace Fleet {

/// What happened in one second.
struct Second {
    std::uint64_t bytes = 0;    ///< Of request bodies, compressed.
    std::uint32_t stored = 0;   ///< Events that the desktops stored.
    std::uint32_t requests = 0; ///< All requests, also those that failed.
    std::uint32_t noAnswer = 0; ///< Requests that got no answer.
    std::uint32_t later = 0;    ///< Requests that were answered with 503.
    std::uint32_t events = 0;   ///< Events that collectors stored.
    std::uint32_t left = 0;     ///< Events that left an outbox.
    /// Events that left an outbox after the outage, and were stored before its end.
    std::uint32_t backlogLeft = 0;
};

/// All counters of a run. They are sums, so the order in which shards add to them does not matter.
struct Tally {
    explicit Tally(Tick end) : seconds(end / SECOND + 1) {}

    Second& At(Tick tick) { return seconds[tick / SECOND]; }
    void Add(const Tally& other);

    std::vector<Second> seconds;
    std::uint64_t stored = 0;
    std::uint64_t delivered = 0;   ///< Events that a desktop deleted after an answer.
    std::uint64_t taken = 0;       ///< Events that collectors stored, duplicates included.
    std::uint64_t duplicates = 0;  ///< Events that a collector stored again.
    std::uint64_t unconfirmed = 0; ///< Stored by a collector; the desktop has no answer at the end.
    std::uint64_t dropped = 0;
    std::uint64_t droppedTaken = 0; ///< Dropped events that a collector had stored before.
    std::uint64_t dropRuns = 0;     ///< Lines in the desktops' logs that say that a run of drops began.
    std::uint64_t deadLettered = 0;
    std::uint64_t waiting = 0;      ///< Events that wait at the end of the run.
    std::uint64_t backlog = 0;      ///< Events that waited when the outage ended.
    std::uint64_t triedAlone = 0;   ///< Requests with an event that had stepped aside.
    std::uint64_t desktopBytes = 0; ///< Memory of the simulated desktops.
};

} // namespace Fleet
