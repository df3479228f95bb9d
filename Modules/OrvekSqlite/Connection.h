#pragma once

#include <string>

#include <SQLiteCpp/Database.h>

#include "Modules/OrvekSqlite/Settings.h"
#include "Modules/OrvekSqlite/Statement.h"
#include "Modules/OrvekSqlite/StatementGuard.h"

namespace OrvekSqlite {

/// An open database file: write-ahead log, guarded statements, and files that only their owner can read.
///
/// After a statement outside a transaction returned, its effect survives the end of the process, kill -9
/// included. Power loss may take the last moments' rows, never the database: that is what synchronous NORMAL
/// means with a write-ahead log, and it costs no sync per row.
///
/// Life: opened by the constructor, closed by the destructor. A connection whose file was replaced is of no
/// use any more and does not heal: the owner drops it and opens the path again.
///
/// Threads: one at a time.
/// Failure: throws SQLite::Exception.
class Connection {
public:
    /// Opens the file at `path`. Never creates one: an empty database would look like a store that works and
    /// has lost its rows.
    Connection(const std::string& path, const Settings& settings);
    ~Connection();

    Statement Prepare(const std::string& sql, Permission permission) {
        return Statement(m_database.getHandle(), m_guard, sql, permission);
    }

    /// For the transactions of the plug-in itself.
    SQLite::Database& Handle() { return m_database; }

    /// Whether the path still leads to the file that is open here, and that is still a database. Asked after
    /// each operation: a row that was written to a file which has no name any more is lost, and only looking
    /// afterwards tells. Costs a stat and a read of 16 bytes, about a microsecond.
    bool IsInPlace();

private:
    bool HasLostItsName();
    bool HasDatabaseHeader();

    StatementGuard m_guard; ///< outlives the connection that calls it
    SQLite::Database m_database;
};

} // namespace OrvekSqlite
