#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace reportctl::store {

/// Appends a field by RFC 4180: it is put in quotes when it has a comma, a quote or a line's end. NULL
/// becomes an empty field and an empty text becomes "", so that a reader can tell them apart.
void AppendCsvField(std::string& out, std::optional<std::string_view> text);

} // namespace reportctl::store
