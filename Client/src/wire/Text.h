#pragma once

#include <string_view>

#include "wire/Buffer.h"

namespace hublink::wire {

/// How single quotes are written. The service puts the texts of a report for the store unchanged into an SQL
/// statement, where a quote inside a text must be written twice. A report for analytics does not become SQL.
enum class Quotes { AsTheyAre, Doubled };

/// Whether the text is UTF-8 (no overlong form, no surrogate, nothing beyond U+10FFFF) without a zero
/// character. The service cuts a datagram at a zero byte, and an SQL statement ends there.
bool IsText(std::string_view text);

/// Appends a valid text (IsText) as the inside of a JSON string.
void AppendEscaped(Buffer& buffer, std::string_view text, Quotes quotes);

} // namespace hublink::wire
