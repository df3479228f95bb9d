#pragma once

#include <cstddef>
#include <string>

namespace SystemTool::IO {

/// Rewrites numbers that are valid JSON but that the parser refuses as too big. The parser looks at the
/// digits of an exponent alone, so it refuses 0e309. It also refuses every integer part of 310 digits, even
/// with a negative exponent that makes the number small.
///
/// From the number at byte `from` on, which must not be within a string, each number gets another text of the
/// same value and length, where there is one. True when at least one number was replaced. A number beyond the
/// range of a double stays, and a second parse reports it.
bool RewriteNumbers(std::string& json, std::size_t from);

} // namespace SystemTool::IO
