#include "Modules/OrvekSqlite/file/LiveFile.h"

#include <filesystem>
#include <utility>

#include <SQLiteCpp/Exception.h>

#include "Modules/Sqlite/ErrorKind.h"

namespace OrvekSqlite::file {
namespace {

/// Errors of the open file, and not of the statement. To look at the path again may be the remedy.
bool IsAboutTheFile(const SQLite::Exception& error) {
    const auto kind = Sqlite::KindOf(error.getErrorCode());
    return kind == Sqlite::ErrorKind::Reopen || kind == Sqlite::ErrorKind::Damage;
}

/// A file may be replaced again while it is opened anew, by a busy script. One that is replaced each time is
/// no store.
constexpr int MAX_ATTEMPTS = 3;

constexpr std::size_t PATH_ROOM_BYTES = 4096; ///< The longest path that the system takes.

/// A later change of the working directory must not lead to another file, and no name is special to SQLite
/// (":memory:") once it starts with a slash. An empty path stays empty.
std::string AsAbsolute(const std::string& path) {
    std::error_code error;
    const auto absolute = std::filesystem::absolute(path, error);
    return error ? path : absolute.string();
}

} // namespace

LiveFile::LiveFile(const Settings& settings) : m_settings(settings) {
    // The path comes once, when the program begins: no memory for it then must not cost every row until a
    // restart.
    m_path.reserve(PATH_ROOM_BYTES);
}

void LiveFile::Set(const std::string& path) {
    LetGo();
    m_path = path; // for which there is room
    const std::string absolute = AsAbsolute(path);
    m_path = absolute; // copied, so that the room stays
}

/// A connection that was opened for this very operation and fails has nothing newer to offer.
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
            if (LetGo() && isCommitted) // run again, its rows would be there twice
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

/// Whether a file beside the database was deleted and all that was committed is in the database all the same.
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
    if (m_connection->InTransaction()) // without the memory for a rollback, closing is one
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
    // SQLite would take an empty name for a database in memory, and a zero byte for the end of the name.
    if (m_path.empty() || m_path.find('\0') != std::string::npos)
        throw SQLite::Exception(sqlite3_errstr(SQLITE_CANTOPEN), SQLITE_CANTOPEN);
    auto settings = m_settings;
    settings.busyTimeout = m_patience;
    m_connection = std::make_unique<Connection>(m_path, settings);
}

} // namespace OrvekSqlite::file
