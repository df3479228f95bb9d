#pragma once

#include <string>

#include "Tools/reportctl/log/Entry.h"

namespace reportctl::log {

/// The entry as one line for a person, without a line feed: time, kind, event id, the beginning of the value,
/// and the outcome. Control characters are escaped, so that nothing in it can control a terminal.
std::string TextOf(const Entry& entry);

/// The entry as a JSON object on one line, without a line feed. Its keys are `time`, `kind`, `eventID`,
/// `outcome`, `reason` and `text`; `eventID` and `reason` are null when there is none.
std::string JsonOf(const Entry& entry);

/// The time in local time with its offset, such as `2026-11-21T14:05:06.789+01:00`.
std::string IsoTime(terminal::TimePoint time);

} // namespace reportctl::log
