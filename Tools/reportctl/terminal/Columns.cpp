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

} // namespace

std::size_t Columns() {
    winsize size{};
    return ::ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 ? size.ws_col : 0;
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

} // namespace reportctl::terminal
