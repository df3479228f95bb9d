#pragma once

#include <chrono>
#include <cstddef>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/MetrikSdk/Settings.h"

namespace MetrikSdk::upload {

/// The oldest waiting events, as far as a plan needs them.
struct QueueHead {
    std::size_t count = 0;   ///< At most as many as were asked for.
    std::size_t fitting = 0; ///< So many of them make a request that is full by count or by bytes, or all.
    WallTime oldest{};       ///< When the first of them was stored.
};

/// A single event is sent however large it is. Pure.
QueueHead HeadOf(const Batch& oldest, std::size_t maxEvents, const BatchSettings& settings);

/// Which of the oldest waiting events are sent together, and when.
struct BatchPlan {
    std::size_t count = 0;             ///< How many events, from the front of the list.
    std::chrono::milliseconds wait{0}; ///< How long to wait for more events; 0: send at once.
};

/// Plans the next request from the oldest events. A batch is sent at once when it is full by count or by
/// bytes, or when its first event is old enough. A batch whose first event is from the future is also sent at
/// once: a clock that was set back must not hold it. (An event that is only a moment ahead is not from the
/// future: it was stored after `now` was read.) Pure.
BatchPlan PlanBatch(const QueueHead& head, std::size_t maxEvents, WallTime now,
                    const BatchSettings& settings);

} // namespace MetrikSdk::upload
