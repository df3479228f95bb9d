#include "Modules/MetrikSdk/upload/BatchPlan.h"

namespace MetrikSdk::upload {

QueueHead HeadOf(const Batch& oldest, std::size_t maxEvents, const BatchSettings& settings) {
    QueueHead head{oldest.events.size(), 0, {}};
    std::size_t bytes = 0;
    for (const auto& event : oldest.events) {
        bytes += event.bytes;
        if (head.fitting == maxEvents || (head.fitting > 0 && bytes > settings.maxBytes))
            break;
        ++head.fitting;
    }
    if (head.count > 0)
        head.oldest = oldest.events.front().storedAt;
    return head;
}

BatchPlan PlanBatch(const QueueHead& head, std::size_t maxEvents, WallTime now,
                    const BatchSettings& settings) {
    if (head.count == 0)
        return {};
    const bool full = head.fitting == maxEvents || head.fitting < head.count;
    const auto age = now - Computable(head.oldest);
    if (full || age < -settings.linger || age >= settings.linger)
        return {head.fitting, std::chrono::milliseconds(0)};
    return {head.fitting, settings.linger - age};
}

} // namespace MetrikSdk::upload
