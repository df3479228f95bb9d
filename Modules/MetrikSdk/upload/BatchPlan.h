#pragma once

#include <chrono>
#include <cstddef>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/MetrikSdk/Settings.h"

namespace MetrikSdk::upload {

/// Which of the oldest waiting events travel together, and when.
struct BatchPlan {
    std::size_t count = 0;             ///< From the head of the list.
    std::chrono::milliseconds wait{0}; ///< For more company; 0: at once.
};

/// Plans the next request from the oldest events. A batch is sent at once when it is full by count or by
/// bytes, or when its first event is old enough. So is an event from the future: a clock that was set back
/// must not hold it. (One from the last moment is none: it was stored after `now` was read.) One event
/// travels however large it is. Pure.
BatchPlan PlanBatch(const Batch& oldest, std::size_t maxEvents, WallTime now, const BatchSettings& settings);

} // namespace MetrikSdk::upload
