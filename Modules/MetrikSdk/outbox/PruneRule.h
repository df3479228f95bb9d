#pragma once

#include <cstdint>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/Time.h"

/// The rules for what is too much and what is too old. Pure. The outbox decides when to look, and drops the
/// events.
namespace MetrikSdk::outbox::PruneRule {

/// What an event counts for in every bound on bytes.
std::size_t BytesOf(const NewEvent& event);

/// How many bytes must go; 0 while the cap holds. It is a little more than the excess, so that the next event
/// does not exceed the cap again.
std::int64_t ExcessBytes(std::int64_t waitingBytes, const CapSettings& caps);

/// Events that were stored before this are too old.
///
/// `now` is the wall clock. `openedAt` is the wall clock when the outbox was opened, and `elapsed` is the
/// steady time since then. The earlier of `now` and `openedAt` + `elapsed` counts: a clock that is set years
/// ahead while the service runs must not make every waiting event too old. At worst, a machine that slept
/// keeps its events longer.
WallTime OldestAllowed(WallTime now, WallTime openedAt, std::chrono::milliseconds elapsed,
                       const CapSettings& caps);

/// Whether the wall clock runs like the steady clock, and since when. A wall clock that is wrong when the
/// outbox is opened jumps when it is corrected, and this sees the jump.
struct ClockWatch {
    WallTime lastWall{};
    SteadyTime lastSteady{};
    SteadyTime agreeingSince{};
};

ClockWatch BeginWatch(WallTime wall, SteadyTime steady);

/// The watch after a further look. When the wall clock jumped between the two looks, the agreement begins
/// anew. The slow corrections of a time daemon do not count as a jump.
ClockWatch LookAgain(const ClockWatch& watch, WallTime wall, SteadyTime steady);

/// Whether the clocks have agreed for long enough that events may be called old. Until then, no event is
/// dropped by age: a board without a battery starts in a wrong year, and the network corrects its clock
/// later.
bool MayDropByAge(const ClockWatch& watch, const CapSettings& caps);

} // namespace MetrikSdk::outbox::PruneRule
