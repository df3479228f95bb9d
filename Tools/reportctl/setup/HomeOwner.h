#pragma once

#include <optional>
#include <string>

namespace reportctl::setup {

/// Why set-up must not make the user's data directory `data`, and the command to use; nothing when it may.
///
/// Root's rights without root's home, as after `sudo`, would make files that their user's service cannot
/// open: they would be root's. What tells is the owner of the nearest directory that exists.
std::optional<std::string> ReasonAgainstRoot(const std::string& data);

} // namespace reportctl::setup
