#include "Modules/OrvekSqlite/guard/Statement.h"

#include <new>
#include <string_view>

#include <SQLiteCpp/Exception.h>

namespace OrvekSqlite::guard {

Statement::Statement(sqlite3* connection, StatementGuard& guard, const std::string& sql,
                     Permission permission)
    : m_connection(connection), m_guard(guard) {
    m_guard.Begin(permission);
    try {
        Prepare(sql);
        RefuseWrongKind(permission);
    } catch (...) {
        sqlite3_finalize(m_statement);
        m_guard.End();
        throw;
    }
}

Statement::~Statement() {
    sqlite3_finalize(m_statement);
    m_guard.End();
}

void Statement::Prepare(const std::string& sql) {
    if (sql.find('\0') != std::string::npos)
        throw SQLite::Exception("the statement holds a zero byte", SQLITE_MISUSE);
    if (sql.size() >= static_cast<std::size_t>(sqlite3_limit(m_connection, SQLITE_LIMIT_SQL_LENGTH, -1)))
        // Must be checked before the size becomes an int below.
        throw SQLite::Exception(sqlite3_errstr(SQLITE_TOOBIG), SQLITE_TOOBIG);
    // The length counts the closing zero. So SQLite need not copy the text to append a zero.
    const char* rest = nullptr;
    const int code =
        sqlite3_prepare_v2(m_connection, sql.c_str(), static_cast<int>(sql.size() + 1), &m_statement, &rest);
    if (code != SQLITE_OK)
        Fail(code);
    if (m_statement == nullptr)
        throw SQLite::Exception("the text holds no statement", SQLITE_MISUSE);
    RefuseFurtherStatements(rest, sql.c_str() + sql.size());
}

/// Only SQLite can tell a comment from a statement, so we let SQLite prepare the rest. Preparing a text of
/// comments succeeds and yields no statement. Preparing runs nothing: only a pragma would run, and pragmas
/// are refused.
void Statement::RefuseFurtherStatements(const char* text, const char* end) const {
    while (text < end) {
        sqlite3_stmt* further = nullptr;
        const char* rest = end;
        const int code =
            sqlite3_prepare_v2(m_connection, text, static_cast<int>(end - text + 1), &further, &rest);
        const bool isNothing = code == SQLITE_OK && further == nullptr;
        sqlite3_finalize(further);
        if (!isNothing)
            throw SQLite::Exception("not authorized: a second statement in the text", SQLITE_AUTH);
        text = rest > text ? rest : end;
    }
}

void Statement::RefuseWrongKind(Permission permission) const {
    if (permission == Permission::CreateTable && !m_guard.CreatesTable())
        throw SQLite::Exception("not authorized: only CREATE TABLE creates a table", SQLITE_AUTH);
    if (permission == Permission::Read) {
        if (ColumnCount() == 0 || sqlite3_stmt_readonly(m_statement) == 0)
            throw SQLite::Exception("not authorized: only a query returns rows", SQLITE_AUTH);
    } else if (ColumnCount() != 0) {
        throw SQLite::Exception("not authorized: the statement returns rows", SQLITE_AUTH);
    }
}

void Statement::Execute() {
    const int code = sqlite3_step(m_statement);
    if (code != SQLITE_DONE)
        Fail(code);
}

bool Statement::NextRow() {
    const int code = sqlite3_step(m_statement);
    if (code != SQLITE_ROW && code != SQLITE_DONE)
        Fail(code);
    return code == SQLITE_ROW;
}

std::string Statement::Text(int column) const {
    if (sqlite3_column_type(m_statement, column) == SQLITE_NULL)
        return {};
    const auto* text = reinterpret_cast<const char*>(sqlite3_column_text(m_statement, column));
    if (text == nullptr) // no memory for the conversion to text
        throw std::bad_alloc();
    return {text, static_cast<std::size_t>(sqlite3_column_bytes(m_statement, column))};
}

void Statement::Fail(int code) const {
    if (m_guard.Refusal() != nullptr)
        throw SQLite::Exception(m_guard.Refusal(), code);
    // VACUUM is stopped by the guard when it attaches its copy, or earlier by SQLite when a transaction is
    // open. Both must count as "not authorized": the error must not depend on whether other statements came
    // just before.
    if (std::string_view(sqlite3_errmsg(m_connection)).starts_with("cannot VACUUM"))
        throw SQLite::Exception("not authorized: VACUUM", SQLITE_AUTH);
    throw SQLite::Exception(m_connection, code);
}

} // namespace OrvekSqlite::guard
