#pragma once

#include <string>

#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk::outbox {

/// A new UUID of version 7 in its usual text form: the time in milliseconds, then a counter, then random
/// bits. Every one is greater, as a text too, than all that this process made before, also when the clock
/// goes backwards. Any thread.
std::string NewUuid(WallTime now);

} // namespace MetrikSdk::outbox
