#pragma once

#include <cstddef>
#include <string_view>

#include "Modules/BoostLogger/LineBuffer.h"

namespace BoostLogger {

/// Appends `text` so that it stays on its line, does nothing to a terminal and can be turned back into
/// exactly the same bytes. Readable text in UTF-8 stays as it is, but for:
///   backslash, newline, carriage return, tabulation    a backslash twice, \n, \r, \t
///   other control characters, C1 controls, bytes that are no UTF-8,
///   line separators and text direction overrides       each byte as \x and two hexadecimal digits
void AppendEscaped(LineBuffer& line, std::string_view text);

/// The longest beginning of `text` that has at most `maxBytes` and does not end within a UTF-8 character.
std::string_view CutAtCharacter(std::string_view text, std::size_t maxBytes);

} // namespace BoostLogger
