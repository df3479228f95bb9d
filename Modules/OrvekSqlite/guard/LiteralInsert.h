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

    std::string_view head; ///< up to and with the parenthesis behind "values"
    boost::container::static_vector<Literal, MAX_LITERALS> literals;

    /// `knownHead`: the head of another text for which there was a result, or empty. The next text mostly has
    /// the same, and to read it again was half of the work.
    ///
    /// Nothing for any other text, and when in doubt: an expression, a comment, a sign, a zero byte,
    /// upper-case keywords, anything behind the closing parenthesis. Such a text is no error, it is SQLite's
    /// to judge.
    static std::optional<LiteralInsert> Of(std::string_view sql, std::string_view knownHead = {});
};

} // namespace OrvekSqlite::guard
