#pragma once

#include <string>

#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk::outbox {

/// A new UUID of version 7 in its usual text form: the time in milliseconds, then a counter, then random
/// bits. Each UUID is greater than all that this process made before, also as a text, and also when the clock
/// goes backwards. Threads: any.
std::string NewUuid(WallTime now);

} // namespace MetrikSdk::outbox
