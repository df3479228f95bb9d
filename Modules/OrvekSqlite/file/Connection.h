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
/// After a statement outside a transaction returned, its effect survives the end of the process, kill -9
/// included; the effect of one inside does after Commit. Power loss may take the last moments' rows, never
/// the database: that is what synchronous NORMAL means with a write-ahead log, and it costs no sync per row.
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
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    guard::Statement Prepare(const std::string& sql, guard::Permission permission) {
        return guard::Statement(m_database.getHandle(), m_guard, sql, permission);
    }

    /// Runs one statement that changes data and returns no row. Outside a transaction, which could undo it,
    /// only where the file is still in its place.
    void Execute(const std::string& sql) {
        if (!InTransaction())
            RequireInPlace();
        if (!m_insert.Execute(sql))
            Prepare(sql, guard::Permission::Write).Execute();
    }

    /// Takes the write lock at once: a transaction that began by reading could not wait for it.
    void Begin() { m_database.exec("begin immediate"); }

    /// Once it returned, the transaction survives the end of the process. When it throws, nothing of the
    /// transaction is stored, but the transaction may still be open. Throws when the file is not in its place
    /// any more.
    void Commit() {
        RequireInPlace();
        m_database.exec("commit");
    }

    /// Ends the transaction, if there is one, without its effect.
    void RollBack() noexcept;

    /// SQLite's own word: some errors of a statement end the transaction around it.
    bool InTransaction() const { return sqlite3_get_autocommit(m_database.getHandle()) == 0; }

    /// How long statements wait for the lock of another connection from here on.
    void WaitForLocks(std::chrono::milliseconds patience) {
        sqlite3_busy_timeout(m_database.getHandle(), static_cast<int>(patience.count()));
    }

    /// Whether another process has the database open, be it to write or to read.
    bool IsShared() { return m_others.Exist(); }

    /// Whether the path still leads to the file that is open here, that is still a database, and whose side
    /// files still have their names. Asked after each operation: a row that was written to a file which has
    /// no name any more is lost, and only looking afterwards tells. Costs three stats and a read of 16 bytes,
    /// some two microseconds.
    bool IsInPlace();

    /// What became of rows that were committed, when a file beside the database was deleted.
    enum class Rescue { NotNeeded, Done, Failed };

    /// To be called when the connection is given up; it is of no use afterwards. Rolls back what is open.
    Rescue RescueRows() noexcept;

private:
    /// Throws when not. Asked before what could not be undone: what is not in the old file need not be in
    /// both.
    void RequireInPlace();
    bool HasLostItsName();
    bool HasDatabaseHeader();

    guard::StatementGuard m_guard; ///< outlives the connection that calls it
    SQLite::Database m_database;
    guard::PreparedInsert m_insert;
    OtherUsers m_others;
    std::optional<Sqlite::SideFileWatch> m_sideFiles; ///< Once they are open.
};

} // namespace OrvekSqlite::file
