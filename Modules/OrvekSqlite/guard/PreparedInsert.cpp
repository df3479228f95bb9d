#include "Modules/OrvekSqlite/guard/PreparedInsert.h"

#include <charconv>
#include <cstdint>

#include <SQLiteCpp/Exception.h>

namespace OrvekSqlite::guard {
namespace {

std::string WithParameters(const LiteralInsert& insert) {
    std::string text(insert.head);
    for (std::size_t i = 0; i < insert.literals.size(); ++i)
        text += i == 0 ? "?" : ",?";
    return text += ')';
}

std::string WithSingleQuotes(std::string_view text) {
    std::string single;
    for (std::size_t i = 0; i < text.size(); ++i) {
        single += text[i];
        i += text[i] == '\'' ? 1 : 0; // skips the second of two quotes
    }
    return single;
}

std::int64_t NumberOf(std::string_view digits) {
    std::int64_t number = 0;
    std::from_chars(digits.data(), digits.data() + digits.size(), number);
    return number;
}

int BindTo(sqlite3_stmt* statement, int place, const Literal& literal) {
    if (!literal.isText)
        return sqlite3_bind_int64(statement, place, NumberOf(literal.text));
    if (!literal.hasDoubledQuotes) // no copy: the statement's text lives longer than the step
        return sqlite3_bind_text(statement, place, literal.text.data(), static_cast<int>(literal.text.size()),
                                 SQLITE_STATIC);
    const std::string text = WithSingleQuotes(literal.text);
    return sqlite3_bind_text(statement, place, text.data(), static_cast<int>(text.size()), SQLITE_TRANSIENT);
}

} // namespace

/// While this object lives, statements of the connection may have parameters, and the guard treats the
/// statement as an INSERT. This must hold while the statement runs, too: SQLite compiles it again by itself
/// when another program has changed the tables.
class PreparedInsert::Use {
public:
    explicit Use(PreparedInsert& owner) : m_owner(owner) {
        sqlite3_limit(owner.m_connection, SQLITE_LIMIT_VARIABLE_NUMBER, LiteralInsert::MAX_LITERALS);
        owner.m_guard.Begin(Permission::Write);
        owner.m_guard.ExpectInsert();
    }
    ~Use() {
        if (m_owner.m_statement != nullptr) {
            sqlite3_reset(m_owner.m_statement);
            sqlite3_clear_bindings(m_owner.m_statement);
        }
        m_owner.m_guard.End();
        sqlite3_limit(m_owner.m_connection, SQLITE_LIMIT_VARIABLE_NUMBER, 0);
    }
    Use(const Use&) = delete;
    Use& operator=(const Use&) = delete;

private:
    PreparedInsert& m_owner;
};

bool PreparedInsert::Execute(const std::string& sql) {
    const auto limit = sqlite3_limit(m_connection, SQLITE_LIMIT_SQL_LENGTH, -1);
    if (sql.size() >= static_cast<std::size_t>(limit))
        return false;
    const auto insert = LiteralInsert::Of(sql, m_head);
    if (!insert)
        return false;
    const Use use(*this);
    if (!Prepare(*insert) || !Bind(*insert))
        return false;
    if (const int code = sqlite3_step(m_statement); code != SQLITE_DONE) {
        if (m_guard.Refusal() != nullptr)
            throw SQLite::Exception(m_guard.Refusal(), code);
        throw SQLite::Exception(m_connection, code);
    }
    return true;
}

bool PreparedInsert::Prepare(const LiteralInsert& insert) {
    if (m_statement != nullptr && insert.head == m_head && insert.literals.size() == m_places)
        return true;
    Forget();
    const std::string text = WithParameters(insert);
    if (sqlite3_prepare_v3(m_connection, text.c_str(), static_cast<int>(text.size() + 1),
                           SQLITE_PREPARE_PERSISTENT, &m_statement, nullptr) != SQLITE_OK)
        return false;
    m_head = insert.head;
    m_places = insert.literals.size();
    return true;
}

bool PreparedInsert::Bind(const LiteralInsert& insert) {
    int place = 0;
    for (const auto& literal : insert.literals)
        if (BindTo(m_statement, ++place, literal) != SQLITE_OK)
            return false;
    return true;
}

void PreparedInsert::Forget() {
    sqlite3_finalize(m_statement);
    m_statement = nullptr;
    m_head.clear();
}

} // namespace OrvekSqlite::guard
