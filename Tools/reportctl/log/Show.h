#pragma once

#include <string>

#include "Tools/reportctl/log/Entry.h"

namespace reportctl::log {

/// The entry as one line for a person, without a line feed: time, kind, event id, the beginning of the value,
/// and where it ended. Nothing in it drives a terminal.
std::string TextOf(const Entry& entry);

/// The entry as a JSON object on one line, without a line feed, with the keys `time`, `kind`, `eventID`,
/// `outcome`, `reason` and `text`; eventID and reason are null where there is none.
std::string JsonOf(const Entry& entry);

/// A time as `2026-11-21T14:05:06.789+01:00`.
std::string IsoTime(terminal::TimePoint time);

} // namespace reportctl::log
