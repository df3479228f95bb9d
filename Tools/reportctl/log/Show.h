#pragma once

#include <string>

#include "Tools/reportctl/log/Entry.h"

namespace reportctl::log {

/// The entry as one line for a person, without a line feed: time, kind, event id, the beginning of the value,
/// and the outcome. Control characters are escaped, so that nothing in it can control a terminal. `columns`:
/// of the terminal, where the value becomes shorter so that the line fits; 0 means no terminal.
std::string TextOf(const Entry& entry, std::size_t columns);

/// The entry as a JSON object on one line, without a line feed. Its keys are `time`, `kind`, `eventID`,
/// `outcome`, `reason` and `text`; `eventID` and `reason` are null when there is none.
std::string JsonOf(const Entry& entry);

} // namespace reportctl::log
