#pragma once

#include <cstddef>
#include <string>

#include <sqlite3.h>

#include "Modules/OrvekSqlite/guard/LiteralInsert.h"
#include "Modules/OrvekSqlite/guard/StatementGuard.h"

namespace OrvekSqlite::guard {

/// Runs INSERTs of literals with one prepared statement, as long as they differ only in their literals.
/// Compiling a text takes two thirds of a statement's time, and the texts of the store differ only in their
/// literals. What a text does, and which error it gives, is the same as without this class.
///
/// Ownership: belongs to the connection that it is made with, and must be destroyed before that is closed.
/// Threads: those of the connection.
/// Failure: throws SQLite::Exception.
class PreparedInsert {
public:
    PreparedInsert(sqlite3* connection, StatementGuard& guard) : m_connection(connection), m_guard(guard) {}
    ~PreparedInsert() { Forget(); }

    PreparedInsert(const PreparedInsert&) = delete;
    PreparedInsert& operator=(const PreparedInsert&) = delete;

    /// Runs `sql`. Returns false, without any effect, when `sql` is not an INSERT of literals alone, or
    /// cannot be prepared as one. Then the caller must run it as it stands, so that it gives its own error.
    bool Execute(const std::string& sql);

private:
    class Use;

    bool Prepare(const LiteralInsert& insert);
    bool Bind(const LiteralInsert& insert);
    void Forget();

    sqlite3* m_connection;
    StatementGuard& m_guard;
    sqlite3_stmt* m_statement = nullptr;
    std::string m_head;       ///< The head of m_statement's text; empty while there is no statement.
    std::size_t m_places = 0; ///< How many parameters m_statement has. Each takes the place of a literal.
};

} // namespace OrvekSqlite::guard
