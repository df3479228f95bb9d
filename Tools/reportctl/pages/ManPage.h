#pragma once

#include <string>

#include "Tools/reportctl/pages/Command.h"

namespace reportctl::pages {

/// The manual page of a command, in mdoc. Its own commands get pages of theirs when it is reportctl itself,
/// and sections of this page otherwise. `date` is the version's, as mdoc writes it ("November 22, 2026").
std::string ManPage(const Command& command, const std::string& date);

} // namespace reportctl::pages
