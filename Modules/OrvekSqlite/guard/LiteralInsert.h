#pragma once

#include <cstddef>
#include <optional>
#include <string_view>
#include <vector>

namespace OrvekSqlite::guard {

/// A value that stands in a statement's text.
struct Literal {
    bool isText;           ///< else an integer of at most 18 digits
    bool hasDoubledQuotes; ///< within `text`
    std::string_view text; ///< without the quotes around it
};

/// The text of an INSERT whose values are literals and nothing else, taken apart: what it says before them is
/// the same for each of its kind.
///
/// Views into the text; they live as long as that does.
struct LiteralInsert {
    /// More than the store's statement needs.
    static constexpr std::size_t MAX_LITERALS = 32;

    std::string_view head; ///< up to and with the parenthesis behind "values"
    std::vector<Literal> literals;

    /// Nothing for any other text, and when in doubt: an expression, a comment, a sign, a zero byte,
    /// upper-case keywords, anything behind the closing parenthesis. Such a text is no error, it is SQLite's
    /// to judge.
    static std::optional<LiteralInsert> Of(std::string_view sql);
};

} // namespace OrvekSqlite::guard
