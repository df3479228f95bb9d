#pragma once

#include <string_view>

namespace hublink::wire {

/// What happens to a number in the service, which reads it and prints it again. The service keeps an integer
/// of 64 bits digit for digit, and any other number as a double.
enum class Fate {
    Exact,   ///< It stays the same number, digit for digit.
    Rounded, ///< It becomes the nearest double, which is what most JSON readers make of it anyway.
    Lost,    ///< The service cannot read it: an integer of more than 64 bits, or too large for a double.
};

/// The number's fate. Only its digits are looked at, because the C library's conversion depends on the
/// program's locale.
Fate FateOf(std::string_view number);

/// The length of the number at the start of `text` by JSON's grammar; 0 when there is none.
std::size_t NumberLength(std::string_view text);

} // namespace hublink::wire
