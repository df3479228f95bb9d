#pragma once

#include <string>

#include "Tools/reportctl/pages/Command.h"

/// What makes a shell complete reportctl's command line. An option's value is completed with its choices, or,
/// when it has none, with names of files.
namespace reportctl::pages {

std::string BashCompletion(const Command& program);
std::string ZshCompletion(const Command& program);
std::string FishCompletion(const Command& program);

} // namespace reportctl::pages
