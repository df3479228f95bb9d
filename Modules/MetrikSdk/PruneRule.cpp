#include "Modules/MetrikSdk/PruneRule.h"

#include <algorithm>

namespace Metrik::PruneRule {

std::int64_t ExcessBytes(std::int64_t waitingBytes, const CapSettings& caps) {
    const auto cap = static_cast<std::int64_t>(caps.maxWaitingBytes);
    return waitingBytes <= cap ? 0 : waitingBytes - cap + cap / 100;
}

WallTime OldestAllowed(WallTime now, WallTime openedAt, std::chrono::milliseconds elapsed,
                       const CapSettings& caps) {
    return std::min(now, openedAt + elapsed) - caps.maxAge;
}

bool BeginsRun(std::optional<SteadyTime> lastDrop, SteadyTime now, const CapSettings& caps) {
    return !lastDrop || now - *lastDrop > caps.dropRunEnds;
}

} // namespace Metrik::PruneRule
