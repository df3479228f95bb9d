#pragma once

#include <string>
#include <string_view>

namespace reportctl::terminal {

/// The text as it may be shown on a terminal: what is in a report was written by another program, and may
/// hold sequences that move the cursor, or characters that hide. They are escaped as in the log.
std::string Printable(std::string_view text);

} // namespace reportctl::terminal
