#include "Tools/reportctl/terminal/Columns.h"

#include <algorithm>

#include <sys/ioctl.h>
#include <unistd.h>

namespace reportctl::terminal {
namespace {

/// Counts characters of UTF-8. Nearly all that reportctl prints takes one column each.
std::size_t WidthOf(std::string_view text) {
    return static_cast<std::size_t>(std::count_if(text.begin(), text.end(), [](char byte) {
        constexpr unsigned FIRST_BITS = 0xc0;
        constexpr unsigned CONTINUED = 0x80;
        return (static_cast<unsigned char>(byte) & FIRST_BITS) != CONTINUED;
    }));
}

/// Takes the next word from the line, with the blanks before it.
std::string_view TakeWord(std::string_view& line) {
    const auto begin = std::min(line.find_first_not_of(' '), line.size());
    const auto end = std::min(line.find(' ', begin), line.size());
    const auto word = line.substr(0, end);
    line.remove_prefix(end);
    return word;
}

winsize SizeOfTerminal() {
    winsize size{};
    return ::ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 ? size : winsize{};
}

/// A line without blanks can be longer than the terminal is wide.
std::size_t RowsOf(std::string_view line, std::size_t columns) {
    const auto width = WidthOf(line);
    return columns == 0 || width == 0 ? 1 : (width + columns - 1) / columns;
}

} // namespace

std::size_t Columns() {
    return SizeOfTerminal().ws_col;
}

std::size_t Rows() {
    return SizeOfTerminal().ws_row;
}

std::string Broken(std::string_view line, std::size_t columns, std::size_t indent) {
    constexpr std::size_t LEAST = 20; // with fewer columns for the text, nearly each word would be a line
    if (columns < indent + LEAST)
        return std::string(line);
    std::string text;
    std::size_t used = 0;
    while (!line.empty()) {
        auto word = TakeWord(line);
        if (used > indent && used + WidthOf(word) > columns) {
            text += '\n' + std::string(indent, ' ');
            word.remove_prefix(std::min(word.find_first_not_of(' '), word.size()));
            used = indent;
        }
        text += word;
        used += WidthOf(word);
    }
    return text;
}

std::string FirstRows(std::string_view text, std::size_t rows, std::size_t columns) {
    std::size_t used = 1; // the cursor's
    for (std::size_t begin = 0; rows != 0 && begin < text.size();) {
        const auto end = std::min(text.find('\n', begin), text.size());
        used += RowsOf(text.substr(begin, end - begin), columns);
        if (used > rows)
            return std::string(text.substr(0, begin));
        begin = end + 1;
    }
    return std::string(text);
}

} // namespace reportctl::terminal
