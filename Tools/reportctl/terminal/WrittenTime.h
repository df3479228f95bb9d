#pragma once

#include <string>

#include "Tools/reportctl/terminal/TimeArgument.h"

/// The three ways in which reportctl writes a time.
namespace reportctl::terminal {

/// For programs: UTC, such as `2026-11-21T14:05:06.789Z`.
std::string UtcTime(TimePoint time);

/// For programs: local time with its offset, such as `2026-11-21T14:05:06.789+01:00`.
std::string ZonedTime(TimePoint time);

/// For a person at this machine: local time as the log writes it, such as `2026-11-21 14:05:06.789`.
std::string LocalTime(TimePoint time);

} // namespace reportctl::terminal
