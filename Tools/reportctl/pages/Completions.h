#pragma once

#include <string>

#include "Tools/reportctl/pages/Command.h"

/// The scripts with which shells complete reportctl's command line. An option's value is completed with its
/// choices, or with names of files when it has no choices.
namespace reportctl::pages {

std::string BashCompletion(const Command& program);
std::string ZshCompletion(const Command& program);
std::string FishCompletion(const Command& program);

} // namespace reportctl::pages
