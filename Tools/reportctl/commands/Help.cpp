#include "Tools/reportctl/commands/Help.h"

#include <sstream>

#include "Tools/reportctl/terminal/Columns.h"

namespace reportctl::commands {
namespace {

/// Joins the lines of each paragraph, and breaks it anew. Lines with blanks at their beginning are examples.
std::string Reflowed(const std::string& text, std::size_t columns) {
    std::istringstream lines(text);
    std::string result;
    std::string paragraph;
    const auto end = [&] {
        if (!paragraph.empty())
            result += terminal::Broken(paragraph, columns) + '\n';
        paragraph.clear();
    };
    for (std::string line; std::getline(lines, line);) {
        if (line.empty() || line.front() == ' ') {
            end();
            result += line + '\n';
        } else {
            paragraph += (paragraph.empty() ? "" : " ") + line;
        }
    }
    end();
    return result;
}

} // namespace

/// A description in the right column. CLI11 itself indents the lines after the first.
std::string Help::Described(const std::string& text) const {
    const auto left = get_column_width();
    return m_columns > left ? terminal::Broken(text, m_columns - left) : text;
}

std::string Help::make_option_desc(const CLI::Option* option) const {
    return Described(Formatter::make_option_desc(option));
}

std::string Help::make_subcommand(const CLI::App* command) const {
    std::ostringstream text;
    CLI::detail::format_help(text, command->get_display_name(true), Described(command->get_description()),
                             get_column_width());
    return text.str();
}

std::string Help::make_description(const CLI::App* command) const {
    const auto text = Formatter::make_description(command);
    return m_columns == 0 ? text : Reflowed(text, m_columns);
}

std::string Help::make_footer(const CLI::App* command) const {
    const auto text = Formatter::make_footer(command);
    return m_columns == 0 ? text : Reflowed(text, m_columns);
}

} // namespace reportctl::commands
