#include "Modules/MetrikSdk/outbox/PruneRule.h"

#include <algorithm>

namespace MetrikSdk::outbox::PruneRule {
namespace {

/// Row and b-tree overhead of an event, roughly, so that a million empty events do not count as nothing.
constexpr std::size_t ROW_OVERHEAD_BYTES = 80;

} // namespace

std::size_t BytesOf(const NewEvent& event) {
    return event.payload.size() + event.eventId.size() + ROW_OVERHEAD_BYTES;
}

std::int64_t ExcessBytes(std::int64_t waitingBytes, const CapSettings& caps) {
    const auto cap = static_cast<std::int64_t>(caps.maxWaitingBytes);
    return waitingBytes <= cap ? 0 : waitingBytes - cap + cap / 100;
}

WallTime OldestAllowed(WallTime now, WallTime openedAt, std::chrono::milliseconds elapsed,
                       const CapSettings& caps) {
    return std::min(now, openedAt + elapsed) - caps.maxAge;
}

ClockWatch BeginWatch(WallTime wall, SteadyTime steady) {
    return {wall, steady, steady};
}

ClockWatch LookAgain(const ClockWatch& watch, WallTime wall, SteadyTime steady) {
    constexpr std::chrono::milliseconds TOLERANCE = std::chrono::minutes(1);
    constexpr int MAX_SLEW = 1000; // a time daemon changes the clock's speed by half of a thousandth at most
    const auto elapsed = std::chrono::floor<std::chrono::milliseconds>(steady - watch.lastSteady);
    const auto apart = std::chrono::abs((wall - watch.lastWall) - elapsed);
    const bool agree = apart <= TOLERANCE + elapsed / MAX_SLEW;
    return {wall, steady, agree ? watch.agreeingSince : steady};
}

bool MayDropByAge(const ClockWatch& watch, const CapSettings& caps) {
    return watch.lastSteady - watch.agreeingSince >= caps.clockAgreement;
}

} // namespace MetrikSdk::outbox::PruneRule
