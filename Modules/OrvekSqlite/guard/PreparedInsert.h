#pragma once

#include <string>

#include <sqlite3.h>

#include "Modules/OrvekSqlite/guard/LiteralInsert.h"
#include "Modules/OrvekSqlite/guard/StatementGuard.h"

namespace OrvekSqlite::guard {

/// Runs INSERTs of literals with a statement that was prepared once, for as long as they differ in their
/// literals only. SQLite needs two thirds of the time of a statement to compile its text, and the text of the
/// store is always the same otherwise. What a text does, and which error it gives, is what it would be
/// without this.
///
/// Ownership: of the connection that it is made with, and destroyed before that is closed.
/// Threads: those of the connection.
/// Failure: throws SQLite::Exception.
class PreparedInsert {
public:
    PreparedInsert(sqlite3* connection, StatementGuard& guard) : m_connection(connection), m_guard(guard) {}
    ~PreparedInsert() { Forget(); }

    PreparedInsert(const PreparedInsert&) = delete;
    PreparedInsert& operator=(const PreparedInsert&) = delete;

    /// Runs `sql`. False, and nothing happened, when it is no INSERT of literals alone, or none that can be
    /// prepared: it is to be run as it stands, and to give its own error.
    bool Execute(const std::string& sql);

private:
    class Use;

    bool Prepare(const LiteralInsert& insert);
    bool Bind(const LiteralInsert& insert);
    void Forget();

    sqlite3* m_connection;
    StatementGuard& m_guard;
    sqlite3_stmt* m_statement = nullptr;
    std::string m_text; ///< Of m_statement, with parameters in the literals' places.
};

} // namespace OrvekSqlite::guard
