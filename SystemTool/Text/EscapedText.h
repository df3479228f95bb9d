#pragma once

#include <string_view>

#include "SystemTool/Text/LineBuffer.h"

namespace SystemTool::Text {

/// Appends `text` so that it stays on its line, has no effect on a terminal and can be turned back into
/// exactly the same bytes. Readable text in UTF-8 stays as it is, except:
///   backslash, newline, carriage return, tabulation    a backslash twice, \n, \r, \t
///   other control characters, C1 controls, bytes that are no UTF-8,
///   line separators, characters that turn the
///   direction of text, characters that are not seen    each byte as \x and two hexadecimal digits
void AppendEscaped(LineBuffer& line, std::string_view text);

} // namespace SystemTool::Text
