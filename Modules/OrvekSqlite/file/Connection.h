#pragma once

#include <chrono>
#include <optional>
#include <string>

#include <SQLiteCpp/Database.h>

#include "Modules/OrvekSqlite/Settings.h"
#include "Modules/OrvekSqlite/file/OtherUsers.h"
#include "Modules/OrvekSqlite/guard/PreparedInsert.h"
#include "Modules/OrvekSqlite/guard/Statement.h"
#include "Modules/OrvekSqlite/guard/StatementGuard.h"
#include "Modules/Sqlite/DatabaseFiles.h"

namespace OrvekSqlite::file {

/// An open database file: write-ahead log, guarded statements, and files that only their owner can read.
///
/// Durability: after a statement outside a transaction returned, its effect survives the end of the process,
/// kill -9 included. The effect of a statement inside a transaction does so after Commit returned. Power loss
/// may take the rows of the last moments, but never the database. That is what synchronous NORMAL means with
/// a write-ahead log, and it needs no sync per row.
///
/// Life: the constructor opens the file, the destructor closes it. When the file was replaced, the connection
/// cannot be used any more. Then its owner destroys it and opens the path again.
///
/// Threads: one at a time.
/// Failure: throws SQLite::Exception.
class Connection {
public:
    /// Opens the file at `path`. It never creates a file: an empty database would look like a store that
    /// works and has lost its rows.
    Connection(const std::string& path, const Settings& settings);
    ~Connection();
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    guard::Statement Prepare(const std::string& sql, guard::Permission permission) {
        return guard::Statement(m_database.getHandle(), m_guard, sql, permission);
    }

    /// Runs one statement that changes data and returns no row. The effect of a statement outside a
    /// transaction cannot be undone, so such a statement runs only while the file is in its place.
    void Execute(const std::string& sql) {
        if (!InTransaction())
            RequireInPlace();
        if (!m_insert.Execute(sql))
            Prepare(sql, guard::Permission::Write).Execute();
    }

    /// Takes the write lock at once. A transaction that begins with a read could not wait for the lock later.
    void Begin() { m_database.exec("begin immediate"); }

    /// After this returned, the effect of the transaction survives the end of the process. When this throws,
    /// nothing of the transaction is stored, but the transaction may still be open. Throws when the file is
    /// not in its place any more.
    void Commit() {
        RequireInPlace();
        m_database.exec("commit");
    }

    /// Ends an open transaction without its effect. Does nothing when no transaction is open.
    void RollBack() noexcept;

    /// Asks SQLite, because some errors of a statement end the transaction around it.
    bool InTransaction() const { return sqlite3_get_autocommit(m_database.getHandle()) == 0; }

    /// How long statements wait for the lock of another connection from now on.
    void WaitForLocks(std::chrono::milliseconds patience) {
        sqlite3_busy_timeout(m_database.getHandle(), static_cast<int>(patience.count()));
    }

    /// Whether another process has the database open, for writing or for reading.
    bool IsShared() { return m_others.Exist(); }

    /// Whether the path still leads to the open file, the file is still a database, and its side files still
    /// have their names. Call this after each operation: a row in a file that has lost its name is lost, and
    /// only a check after the write finds that out. It takes three stats and a read of 16 bytes, some two
    /// microseconds.
    bool IsInPlace();

    /// What happened to committed rows when a file beside the database was deleted.
    enum class Rescue { NotNeeded, Done, Failed };

    /// Call this before the connection is given up; it cannot be used afterwards. Rolls back an open
    /// transaction.
    Rescue RescueRows() noexcept;

private:
    /// Throws when the file is not in its place. Called before a step that cannot be undone: a statement that
    /// throws here runs again in the new file, and must not be in the old file as well.
    void RequireInPlace();
    bool HasLostItsName();
    bool HasDatabaseHeader();

    guard::StatementGuard m_guard; ///< must outlive m_database, which calls it
    SQLite::Database m_database;
    guard::PreparedInsert m_insert;
    OtherUsers m_others;
    std::optional<Sqlite::SideFileWatch> m_sideFiles; ///< Set once the side files are open.
};

} // namespace OrvekSqlite::file
