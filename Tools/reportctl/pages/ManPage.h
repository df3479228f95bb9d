#pragma once

#include <string>

#include "Tools/reportctl/pages/Command.h"

namespace reportctl::pages {

/// The manual page of a command, in mdoc. The page of reportctl itself lists its commands, which have pages
/// of their own. The page of a command has sections for the commands below it. `date` is the date of the
/// version, as mdoc writes it ("November 22, 2026").
std::string ManPage(const Command& command, const std::string& date);

} // namespace reportctl::pages
