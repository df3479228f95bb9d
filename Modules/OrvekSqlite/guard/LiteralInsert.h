#pragma once

#include <cstddef>
#include <optional>
#include <string_view>

#include <boost/container/static_vector.hpp>

namespace OrvekSqlite::guard {

/// A value in the text of a statement.
struct Literal {
    bool isText;           ///< false: an integer of at most 18 digits
    bool hasDoubledQuotes; ///< whether `text` holds a doubled quote
    std::string_view text; ///< without the quotes around it
};

/// The parts of an INSERT whose values are all literals. The part before the values is the same for all
/// INSERTs of one kind.
///
/// The parts are views into the text, and are valid as long as the text.
struct LiteralInsert {
    /// More than the store's statement needs.
    static constexpr std::size_t MAX_LITERALS = 32;

    std::string_view head; ///< everything up to the parenthesis after "values", with that parenthesis
    boost::container::static_vector<Literal, MAX_LITERALS> literals;

    /// Returns nothing for any other text, and in doubtful cases: an expression, a comment, a sign, a zero
    /// byte, upper-case keywords, anything after the closing parenthesis. Such a text is no error; SQLite
    /// decides about it.
    ///
    /// `knownHead`: the head of an earlier result, or empty. When `sql` starts with `knownHead`, the head is
    /// not examined again. That halves the time, because most texts have the same head as the text before.
    static std::optional<LiteralInsert> Of(std::string_view sql, std::string_view knownHead = {});
};

} // namespace OrvekSqlite::guard
