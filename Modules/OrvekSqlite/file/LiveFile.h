#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>

#include "Modules/OrvekSqlite/Settings.h"
#include "Modules/OrvekSqlite/file/Connection.h"

namespace OrvekSqlite::file {

/// A path, and the connection to the database that is at that path now. The connection is opened as soon as
/// that works, and again when the file was replaced.
///
/// Threads: one at a time.
/// Failure: throws SQLite::Exception.
class LiveFile {
public:
    using Operation = std::function<void(Connection&)>;

    explicit LiveFile(const Settings& settings);

    /// Closes the file that is open. All later operations go to `path`.
    void Set(const std::string& path);

    /// Runs the operation. When it turns out that the connection has lost its file, runs the operation once
    /// more on a new connection, because the first run had no effect that counts. A transaction that was open
    /// on the old connection is gone. The operation can find that out by Connection::InTransaction.
    ///
    /// When a file beside the database was deleted, the connection is replaced, too, but no row is lost that
    /// the operation committed.
    ///
    /// When a transaction was open before the operation and still is afterwards, this does not check the
    /// file's place. The check takes a microsecond or two, and the commit does it anyway.
    void Run(const Operation& operation);

    bool InTransaction() const { return m_connection && m_connection->InTransaction(); }
    bool IsShared() { return m_connection && m_connection->IsShared(); }
    void RollBack() noexcept;

    /// Runs `action`. Its operations on this file fail at once when another program has the lock. All other
    /// operations wait for the lock, up to Settings::busyTimeout.
    void WithoutWaiting(const std::function<void()>& action);

    void Close() { LetGo(); }

    /// Throws when committed rows were lost since the last call.
    void TellLoss();

private:
    bool LetGo() noexcept;
    void SetPatience(std::chrono::milliseconds patience);
    void Connect();

    const Settings m_settings;
    std::string m_path;
    std::chrono::milliseconds m_patience = m_settings.busyTimeout;
    bool m_hasLostRows = false;
    std::unique_ptr<Connection> m_connection; ///< null: the next operation opens it
};

} // namespace OrvekSqlite::file
