#include "Modules/OrvekSqlite/guard/LiteralInsert.h"

#include <algorithm>

namespace OrvekSqlite::guard {
namespace {

constexpr std::string_view BEGIN = "insert into ";
constexpr std::string_view VALUES = "values(";
constexpr std::string_view DIGITS = "0123456789";
constexpr std::size_t MAX_DIGITS = 18; // every number of so many digits fits into 64 bits

/// Whether `c` may be a part of a list of names.
bool IsOfNames(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '_' ||
           c == ' ' || c == ',' || c == '(' || c == ')';
}

/// The text in quotes at the start of `rest`; nothing when the closing quote is missing. Moves `rest` to what
/// comes after the text.
std::optional<Literal> TakeText(std::string_view& rest) {
    bool hasDoubledQuotes = false;
    std::size_t end = rest.find('\'', 1);
    while (end != std::string_view::npos && rest.substr(end + 1).starts_with('\'')) {
        hasDoubledQuotes = true;
        end = rest.find('\'', end + 2);
    }
    if (end == std::string_view::npos)
        return std::nullopt;
    const Literal literal{true, hasDoubledQuotes, rest.substr(1, end - 1)};
    rest.remove_prefix(end + 1);
    return literal;
}

std::optional<Literal> TakeInteger(std::string_view& rest) {
    const std::size_t length = rest.find_first_not_of(DIGITS);
    if (length == 0 || length == std::string_view::npos || length > MAX_DIGITS)
        return std::nullopt;
    const Literal literal{false, false, rest.substr(0, length)};
    rest.remove_prefix(length);
    return literal;
}

/// Appends the literals up to the parenthesis that ends `rest`. Returns false when `rest` holds anything
/// else.
bool TakeLiterals(std::string_view rest, LiteralInsert& insert) {
    while (insert.literals.size() < LiteralInsert::MAX_LITERALS) {
        while (rest.starts_with(' '))
            rest.remove_prefix(1);
        const auto literal = rest.starts_with('\'') ? TakeText(rest) : TakeInteger(rest);
        if (!literal)
            return false;
        insert.literals.push_back(*literal);
        if (rest == ")")
            return true;
        if (!rest.starts_with(','))
            return false;
        rest.remove_prefix(1);
    }
    return false;
}

/// The text before the literals. Empty when it is not the start of an INSERT that we accept.
std::string_view HeadOf(std::string_view sql) {
    const std::size_t values = sql.find(VALUES);
    if (!sql.starts_with(BEGIN) || values == std::string_view::npos)
        return {};
    const std::string_view head = sql.substr(0, values + VALUES.size());
    return std::all_of(head.begin(), head.end(), IsOfNames) ? head : std::string_view();
}

} // namespace

std::optional<LiteralInsert> LiteralInsert::Of(std::string_view sql, std::string_view knownHead) {
    const bool isKnown = !knownHead.empty() && sql.starts_with(knownHead);
    std::optional<LiteralInsert> insert(
        LiteralInsert{isKnown ? sql.substr(0, knownHead.size()) : HeadOf(sql), {}});
    if (insert->head.empty() || sql.find('\0') != std::string_view::npos ||
        !TakeLiterals(sql.substr(insert->head.size()), *insert))
        insert.reset();
    return insert;
}

} // namespace OrvekSqlite::guard
