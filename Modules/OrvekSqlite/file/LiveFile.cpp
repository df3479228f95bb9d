#include "Modules/OrvekSqlite/file/LiveFile.h"

#include <filesystem>
#include <utility>

#include <SQLiteCpp/Exception.h>

#include "Modules/Sqlite/ErrorKind.h"

namespace OrvekSqlite::file {
namespace {

/// Whether the error is about the open file and not about the statement. Opening the path again may help
/// then.
bool IsAboutTheFile(const SQLite::Exception& error) {
    const auto kind = Sqlite::KindOf(error.getErrorCode());
    return kind == Sqlite::ErrorKind::Reopen || kind == Sqlite::ErrorKind::Damage;
}

/// How often the file is opened for one operation. A busy script may replace the file again while it is being
/// opened. A file that is replaced each time cannot be used.
constexpr int MAX_ATTEMPTS = 3;

constexpr std::size_t PATH_ROOM_BYTES = 4096; ///< The longest path that the system takes.

/// A later change of the working directory must not lead to another file, so the path is made absolute. A
/// name that starts with a slash is also never special to SQLite, as ":memory:" is. An empty path stays
/// empty.
std::string AsAbsolute(const std::string& path) {
    std::error_code error;
    const auto absolute = std::filesystem::absolute(path, error);
    return error ? path : absolute.string();
}

} // namespace

LiveFile::LiveFile(const Settings& settings) : m_settings(settings) {
    // The path is set once, when the program begins. Without memory for it at that moment, every row would be
    // lost until a restart. So its memory is reserved here.
    m_path.reserve(PATH_ROOM_BYTES);
}

void LiveFile::Set(const std::string& path) {
    LetGo();
    m_path = path; // the constructor has reserved the room
    const std::string absolute = AsAbsolute(path);
    m_path = absolute; // copied and not moved, so that the reserved room stays
}

/// When a connection that was opened for this very operation fails, the error goes to the caller. A newer
/// connection would not help.
void LiveFile::Run(const Operation& operation) {
    for (int attempt = 0; attempt < MAX_ATTEMPTS; ++attempt) {
        const bool isNew = !m_connection;
        if (isNew)
            Connect();
        try {
            const bool wasInTransaction = m_connection->InTransaction();
            operation(*m_connection);
            if ((wasInTransaction && m_connection->InTransaction()) || m_connection->IsInPlace())
                return;
            const bool isCommitted = !m_connection->InTransaction();
            // When the committed rows are safe, running the operation again would store them twice.
            if (LetGo() && isCommitted)
                return;
        } catch (const SQLite::Exception& error) {
            if (!IsAboutTheFile(error) && m_connection->IsInPlace())
                throw;
            LetGo();
            if (isNew)
                throw;
        }
    }
    throw SQLite::Exception("the database file is being replaced again and again", SQLITE_CANTOPEN);
}

/// Closes the connection. True when a file beside the database was deleted, but all committed rows are in the
/// database.
bool LiveFile::LetGo() noexcept {
    if (!m_connection)
        return false;
    const auto rescue = m_connection->RescueRows();
    m_hasLostRows = m_hasLostRows || rescue == Connection::Rescue::Failed;
    m_connection.reset();
    return rescue == Connection::Rescue::Done;
}

void LiveFile::TellLoss() {
    if (std::exchange(m_hasLostRows, false))
        throw SQLite::Exception("the write-ahead log was deleted, and the rows that were only in it are lost",
                                SQLITE_IOERR);
}

void LiveFile::RollBack() noexcept {
    if (!m_connection)
        return;
    m_connection->RollBack();
    if (m_connection->InTransaction()) // no memory for a rollback: closing the connection rolls back, too
        LetGo();
}

void LiveFile::WithoutWaiting(const std::function<void()>& action) {
    SetPatience(std::chrono::milliseconds(0));
    try {
        action();
    } catch (...) {
        SetPatience(m_settings.busyTimeout);
        throw;
    }
    SetPatience(m_settings.busyTimeout);
}

void LiveFile::SetPatience(std::chrono::milliseconds patience) {
    m_patience = patience;
    if (m_connection)
        m_connection->WaitForLocks(patience);
}

void LiveFile::Connect() {
    // SQLite would take an empty path for a temporary database, and a zero byte for the end of the path.
    if (m_path.empty() || m_path.find('\0') != std::string::npos)
        throw SQLite::Exception(sqlite3_errstr(SQLITE_CANTOPEN), SQLITE_CANTOPEN);
    auto settings = m_settings;
    settings.busyTimeout = m_patience;
    m_connection = std::make_unique<Connection>(m_path, settings);
}

} // namespace OrvekSqlite::file
