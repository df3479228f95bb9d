#pragma once

#include <algorithm>
#include <string_view>

namespace reportctl::store {

/// Whether the text has a quote that ends an SQL literal. The service puts texts into its SQL as they are. In
/// a literal, two quotes mean one quote, so a quote without a second one ends it.
inline bool HasLoneQuote(std::string_view text) {
    for (auto quote = text.find('\''); quote != std::string_view::npos; quote = text.find('\'', quote)) {
        const auto end = std::min(text.find_first_not_of('\'', quote), text.size());
        if ((end - quote) % 2 != 0)
            return true;
        quote = end;
    }
    return false;
}

/// Whether the text has quotes, and each of them is written twice.
inline bool HasDoubledQuotes(std::string_view text) {
    return text.find('\'') != std::string_view::npos && !HasLoneQuote(text);
}

} // namespace reportctl::store
