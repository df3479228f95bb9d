#include "Tools/reportctl/terminal/Printable.h"

#include "SystemTool/Text/EscapedText.h"

namespace reportctl::terminal {

std::string Printable(std::string_view text) {
    SystemTool::Text::LineBuffer line;
    SystemTool::Text::AppendEscaped(line, text);
    return std::string(SystemTool::Text::TextOf(line));
}

} // namespace reportctl::terminal
