#include "Modules/MetrikSdk/upload/BatchPlan.h"

namespace MetrikSdk::upload {
namespace {

std::size_t CountWithin(const Batch& oldest, std::size_t maxEvents, std::size_t maxBytes) {
    std::size_t count = 0;
    std::size_t bytes = 0;
    for (const auto& event : oldest.events) {
        bytes += event.bytes;
        if (count == maxEvents || (count > 0 && bytes > maxBytes))
            break;
        ++count;
    }
    return count;
}

} // namespace

BatchPlan PlanBatch(const Batch& oldest, std::size_t maxEvents, WallTime now, const BatchSettings& settings) {
    if (oldest.events.empty())
        return {};
    const auto count = CountWithin(oldest, maxEvents, settings.maxBytes);
    const bool full = count == maxEvents || count < oldest.events.size();
    const auto age = now - Computable(oldest.events.front().storedAt);
    if (full || age < -settings.linger || age >= settings.linger)
        return {count, std::chrono::milliseconds(0)};
    return {count, settings.linger - age};
}

} // namespace MetrikSdk::upload
