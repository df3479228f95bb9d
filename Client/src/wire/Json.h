#pragma once

#include <cstddef>
#include <string_view>

#include "wire/Buffer.h"
#include "wire/JsonNumber.h"
#include "wire/Text.h"

namespace hublink::wire {

/// What ReadJson finds out about a text. Unless `isJson`, the other facts are those of the part that was
/// read.
struct JsonFacts {
    bool isJson = false;
    bool isObject = false;
    Fate fate = Fate::Exact; ///< The worst fate of all its numbers.
    std::size_t levels = 0;  ///< How deep its objects and arrays are nested.
    bool isCompact = true;   ///< It has no white space outside its strings.
};

/// A text with more levels than this is too long for a datagram. ReadJson stops there and says that the text
/// is not JSON, with this number of levels.
inline constexpr std::size_t MAX_LEVELS = MAX_DATAGRAM_BYTES;

/// Reads a valid text (IsText) by JSON's grammar. An escape must be a whole character: half a surrogate pair
/// is an error. Does not recurse.
JsonFacts ReadJson(std::string_view text);

/// Appends a text that ReadJson found to be JSON, as a JSON value and without white space. Quotes::Doubled
/// also doubles a quote that is written as an escape.
/// `isCompact`: JsonFacts::isCompact of the text; false when it is not known.
void AppendJson(Buffer& buffer, std::string_view json, Quotes quotes, bool isCompact);

/// Appends a text that ReadJson found to be JSON, without white space, as the inside of a JSON string.
void AppendJsonEscaped(Buffer& buffer, std::string_view json, Quotes quotes);

} // namespace hublink::wire
