#pragma once

#include <string>

#include <sqlite3.h>

#include "Modules/OrvekSqlite/guard/StatementGuard.h"

namespace OrvekSqlite::guard {

/// One prepared statement. The guard checks it from the constructor to the destructor. A connection may have
/// only one at a time.
///
/// We use the C interface and not the wrapper's class. That class does not say where the statement's text
/// ended, so it would run the first of two statements and silently leave out the second.
///
/// Failure: every operation throws SQLite::Exception, with SQLite's text for SQLite's errors and the guard's
/// for refusals.
class Statement {
public:
    /// Prepares `sql`, which must be exactly one statement. White space, comments and semicolons may follow
    /// it, but nothing else. A zero byte is refused, because SQLite would take it for the end of the text.
    Statement(sqlite3* connection, StatementGuard& guard, const std::string& sql, Permission permission);
    ~Statement();

    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;

    /// Runs a statement that returns no row, to its end. A statement that would return rows is refused and
    /// has no effect.
    void Execute();

    /// Moves to the next row of a query; false after the last row. A statement that would change anything is
    /// refused.
    bool NextRow();

    int ColumnCount() const { return sqlite3_column_count(m_statement); }

    /// The cell as text, whole even when it holds zero bytes; a NULL cell is the empty text.
    std::string Text(int column) const;

    sqlite3_stmt* Handle() const { return m_statement; }

private:
    void Prepare(const std::string& sql);
    void RefuseFurtherStatements(const char* text, const char* end) const;
    void RefuseWrongKind(Permission permission) const;
    [[noreturn]] void Fail(int code) const;

    sqlite3* m_connection;
    StatementGuard& m_guard;
    sqlite3_stmt* m_statement = nullptr;
};

} // namespace OrvekSqlite::guard
