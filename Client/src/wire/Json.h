#pragma once

#include <cstddef>
#include <string_view>

#include "wire/Buffer.h"
#include "wire/JsonNumber.h"
#include "wire/Text.h"

namespace hublink::wire {

/// What a text is as JSON.
struct JsonFacts {
    bool isJson = false;
    bool isObject = false;
    Fate fate = Fate::Exact; ///< Of the number that fares worst.
    std::size_t levels = 0;  ///< Of objects and arrays within each other.
    bool isCompact = true;   ///< There is no white space between its parts.
};

/// More levels make a datagram that is too long; what is nested deeper is not read to its end, and counts as
/// no JSON.
inline constexpr std::size_t MAX_LEVELS = MAX_DATAGRAM_BYTES;

/// Reads a valid text (IsText) by JSON's grammar; an escape must be a whole character. Does not recurse.
JsonFacts ReadJson(std::string_view text);

/// Appends JSON (ReadJson) as a JSON value, without white space. With doubled quotes, those behind an escape
/// too.
/// `isCompact`: there is no white space, as JsonFacts says.
void AppendJson(Buffer& buffer, std::string_view json, Quotes quotes, bool isCompact);

/// Appends JSON, without white space, as the inside of a JSON string.
void AppendJsonEscaped(Buffer& buffer, std::string_view json, Quotes quotes);

} // namespace hublink::wire
