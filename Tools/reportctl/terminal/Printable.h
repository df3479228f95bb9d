#pragma once

#include <string>
#include <string_view>

namespace reportctl::terminal {

/// The text as a terminal may show it. Another program wrote the text of a report, which may hold sequences
/// that move the cursor, or invisible characters. They are escaped as in the log.
std::string Printable(std::string_view text);

} // namespace reportctl::terminal
