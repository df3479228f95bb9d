#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace reportctl::terminal {

/// How many columns the terminal at standard output has. 0 when standard output is no terminal, so that a
/// program that reads it gets each line as one line.
std::size_t Columns();

/// How many lines it shows; 0 when standard output is no terminal.
std::size_t Rows();

/// The line, broken at blanks so that each part has at most so many columns. The parts after the first begin
/// with `indent` blanks. With 0 columns, or too few for the indent, the line stays as it is. A
/// word that is longer than a line stays whole.
std::string Broken(std::string_view line, std::size_t columns, std::size_t indent = 0);

/// The lines that fit above the last row of the terminal, which stays free for the cursor. A text with more
/// lines would scroll, and take its beginning out of sight. With 0 rows, the whole text.
std::string FirstRows(std::string_view text, std::size_t rows, std::size_t columns);

} // namespace reportctl::terminal
