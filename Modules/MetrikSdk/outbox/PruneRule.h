#pragma once

#include <cstdint>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/Time.h"

/// What is too much and what is too old. Pure; dropping, and when to look, are the outbox's.
namespace MetrikSdk::outbox::PruneRule {

/// Bytes that must go; 0 while the cap holds. A little more than the excess, so that the next event does not
/// come into the same position.
std::int64_t ExcessBytes(std::int64_t waitingBytes, const CapSettings& caps);

/// Events that were stored before this are too old.
///
/// `now` is the wall clock. `openedAt` and `elapsed` are the wall clock when the outbox was opened and the
/// steady time since: a clock that is set years ahead while the service runs must not make every waiting
/// event too old, so the earlier reading counts. A machine that slept keeps its events longer, at worst.
WallTime OldestAllowed(WallTime now, WallTime openedAt, std::chrono::milliseconds elapsed,
                       const CapSettings& caps);

/// Whether the wall clock runs with the steady one, and since when. A clock that is wrong when the outbox is
/// opened shows in its correction, which is a jump.
struct ClockWatch {
    WallTime lastWall{};
    SteadyTime lastSteady{};
    SteadyTime agreeingSince{};
};

ClockWatch BeginWatch(WallTime wall, SteadyTime steady);

/// The watch after a further look. A step between the two looks begins the agreement anew; what a time daemon
/// does by slewing is none.
ClockWatch LookAgain(const ClockWatch& watch, WallTime wall, SteadyTime steady);

/// Whether the clocks have agreed for long enough that events may be called old. Until then none is dropped
/// by age: a board without a battery starts in a wrong year, and the network corrects its clock later.
bool MayDropByAge(const ClockWatch& watch, const CapSettings& caps);

} // namespace MetrikSdk::outbox::PruneRule
