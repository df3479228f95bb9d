#pragma once

#include <string_view>

namespace hublink::wire {

/// What becomes of a number on its way through the service, which reads it and prints it again: an integer of
/// 64 bits digit for digit, anything else as a double.
enum class Fate {
    Exact,   ///< It arrives as the same number, digit for digit.
    Rounded, ///< As the double that is nearest to it, as most readers of JSON would take it anyway.
    Lost,    ///< An integer that needs more than 64 bits, or a number beyond the doubles.
};

/// The number's fate. Decided by its digits alone: the C library's conversion would depend on the program's
/// locale.
Fate FateOf(std::string_view number);

/// How long the number at the start of `text` is by JSON's grammar; 0 when there is none.
std::size_t NumberLength(std::string_view text);

} // namespace hublink::wire
