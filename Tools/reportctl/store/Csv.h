#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace reportctl::store {

/// Appends a field by RFC 4180: in quotes when it has a comma, a quote or a line's end. NULL is an empty
/// field, an empty text is "", so that the two stay apart.
void AppendCsvField(std::string& out, std::optional<std::string_view> text);

} // namespace reportctl::store
