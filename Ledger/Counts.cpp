#include "Ledger/Counts.h"

#include <algorithm>
#include <numeric>

namespace ReportLedger {

Counts CopyOf(const Counters& counters) {
    Counts counts{};
    for (unsigned i = COUNTERS; i-- > 0;)
        counts[i] = counters[i].load(std::memory_order_acquire);
    return counts;
}

std::uint64_t EndedIn(const Counts& counts) {
    return std::accumulate(&counts[FIRST_OUTCOME], &counts[LAST_OUTCOME] + 1, counts[EMPTY]);
}

std::uint64_t WaitingIn(const Counts& counts) {
    // The consuming thread may be done with a report before the receiving thread has counted it as queued.
    return counts[QUEUED] - std::min(counts[HANDLED], counts[QUEUED]);
}

std::int64_t UnaccountedIn(const Counts& counts) {
    return static_cast<std::int64_t>(counts[RECEIVED] - EndedIn(counts) - counts[LOST_AT_ENDS] -
                                     counts[RECEIVING]) -
           static_cast<std::int64_t>(counts[QUEUED] - counts[HANDLED]);
}

} // namespace ReportLedger
