#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>

#include "Modules/OrvekSqlite/Settings.h"
#include "Modules/OrvekSqlite/file/Connection.h"

namespace OrvekSqlite::file {

/// A path and the connection to the database that is there now: opened when it can be, and again when the
/// file was replaced.
///
/// Threads: one at a time.
/// Failure: throws SQLite::Exception.
class LiveFile {
public:
    using Operation = std::function<void(Connection&)>;

    explicit LiveFile(const Settings& settings);

    /// Lets go of the file that is open, and leads all later operations to `path`.
    void Set(const std::string& path);

    /// Runs the operation, and once more on a new connection when the old one turns out to have lost its
    /// file: then the first run had no effect that counts. A transaction that was open on the old connection
    /// is gone; the operation finds out by Connection::InTransaction.
    ///
    /// A file beside the database that was deleted costs a new connection, and no row that the operation
    /// committed.
    ///
    /// Within a transaction that was open before and is so afterwards, the file is not looked for: that takes
    /// a microsecond, and who commits will look.
    void Run(const Operation& operation);

    bool InTransaction() const { return m_connection && m_connection->InTransaction(); }
    bool IsShared() { return m_connection && m_connection->IsShared(); }
    void RollBack() noexcept;

    /// Runs `action`, whose operations on this file fail at once where another program has the lock. All
    /// other operations wait for it, up to Settings::busyTimeout.
    void WithoutWaiting(const std::function<void()>& action);

    void Close() { LetGo(); }

    /// Throws, once, when rows that had been committed were lost since the last call.
    void TellLoss();

private:
    bool LetGo() noexcept;
    void SetPatience(std::chrono::milliseconds patience);
    void Connect();

    const Settings m_settings;
    std::string m_path;
    std::chrono::milliseconds m_patience = m_settings.busyTimeout;
    bool m_hasLostRows = false;
    std::unique_ptr<Connection> m_connection; ///< null: to be opened by the next operation
};

} // namespace OrvekSqlite::file
