#pragma once

#include <cstddef>
#include <string>

namespace SystemTool::IO {

/// Numbers that are good JSON and that the parser refuses as too big: it looks at the digits of the exponent
/// alone, so that it refuses 0e309, and takes no integer part of 310 digits, whatever exponent follows.
/// Writes another text of the same value and length in the place of each, from the number at byte `from` on,
/// which must not be within a string. Whether there was one. A number beyond the range of a double stays, and
/// is what a second parse tells of.
bool RewriteNumbers(std::string& json, std::size_t from);

} // namespace SystemTool::IO
