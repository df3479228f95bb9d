#pragma once

#include <string_view>

#include "wire/Buffer.h"

namespace hublink::wire {

/// How a text spells single quotes. The service puts the texts of a report for the store into an SQL
/// statement as they are, where a quote is written twice; what goes to analytics never sees SQL.
enum class Quotes { AsTheyAre, Doubled };

/// Whether the text is UTF-8 (no overlong form, no surrogate, nothing beyond U+10FFFF) without a zero
/// character, at which the service cuts a datagram and SQL ends.
bool IsText(std::string_view text);

/// Appends a valid text as the inside of a JSON string.
void AppendEscaped(Buffer& buffer, std::string_view text, Quotes quotes);

} // namespace hublink::wire
