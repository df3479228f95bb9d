#include "Modules/OrvekSqlite/Database.h"

#include <filesystem>
#include <limits>
#include <new>

#include <SQLiteCpp/Exception.h>
#include <SQLiteCpp/Transaction.h>

namespace OrvekSqlite {
namespace {

/// Errors that are the open file's rather than the statement's: another look at the path may be the remedy.
bool IsAboutTheFile(int code) {
    switch (code & 0xff) {
    case SQLITE_READONLY:
    case SQLITE_IOERR:
    case SQLITE_CORRUPT:
    case SQLITE_CANTOPEN:
    case SQLITE_PROTOCOL:
    case SQLITE_NOTADB:
        return true;
    default:
        return false;
    }
}

/// A file that is replaced again while it is opened anew is somebody's busy script; one that is replaced each
/// time is no store.
constexpr int MAX_ATTEMPTS = 3;

/// A later change of the working directory must not lead to another file, and no name is special to SQLite
/// (":memory:") once it starts with a slash. An empty path stays empty.
std::string AsAbsolute(const std::string& path) {
    std::error_code error;
    const auto absolute = std::filesystem::absolute(path, error);
    return error ? path : absolute.string();
}

std::vector<std::string> CellsOf(const Statement& statement) {
    std::vector<std::string> cells;
    const int columns = statement.ColumnCount();
    cells.reserve(static_cast<std::size_t>(columns));
    for (int column = 0; column < columns; ++column)
        cells.push_back(statement.Text(column));
    return cells;
}

int NumberIn(Statement& statement) {
    if (!statement.NextRow() || sqlite3_column_type(statement.Handle(), 0) != SQLITE_INTEGER)
        throw SQLite::Exception("the counting statement returned no number", SQLITE_MISMATCH);
    const auto number = sqlite3_column_int64(statement.Handle(), 0);
    if (number < std::numeric_limits<int>::min() || number > std::numeric_limits<int>::max())
        throw SQLite::Exception("the number does not fit", SQLITE_RANGE);
    return static_cast<int>(number);
}

} // namespace

bool Database::Open(const std::string& path) {
    m_connection.reset();
    m_path = AsAbsolute(path);
    return Run([](Connection&) {});
}

bool Database::CreateTable(const std::string& sql) {
    return Run([&](Connection& connection) { connection.Prepare(sql, Permission::CreateTable).Execute(); });
}

bool Database::ExecSql(const std::string& sql) {
    return Run([&](Connection& connection) { connection.Prepare(sql, Permission::Write).Execute(); });
}

bool Database::BatExecSql(const std::vector<std::string>& sqls) {
    return Run([&](Connection& connection) {
        // The write lock first: a batch that began by reading could not wait for it.
        SQLite::Transaction transaction(connection.Handle(), SQLite::TransactionBehavior::IMMEDIATE);
        for (const auto& sql : sqls)
            connection.Prepare(sql, Permission::Write).Execute();
        transaction.commit();
    });
}

bool Database::QuerySql(const std::string& sql, std::vector<std::vector<std::string>>& rows) {
    const auto before = rows.size();
    const bool done = Run([&](Connection& connection) {
        rows.resize(before);
        auto statement = connection.Prepare(sql, Permission::Read);
        while (statement.NextRow())
            rows.push_back(CellsOf(statement));
    });
    if (!done)
        rows.resize(before);
    return done;
}

bool Database::GetTotalCount(const std::string& sql, int& count) {
    return Run([&](Connection& connection) {
        auto statement = connection.Prepare(sql, Permission::Read);
        count = NumberIn(statement);
    });
}

/// The one place where failures become texts.
template <typename Operation>
bool Database::Run(Operation operation) {
    try {
        RunOnTheFileInPlace(operation);
        return true;
    } catch (const std::bad_alloc&) {
        m_lastError = "out of memory"; // short enough to need none itself
    } catch (const std::exception& error) {
        m_lastError = error.what();
    }
    return false;
}

/// Runs the operation, and once more on a new connection when the old one turns out to have lost its file. A
/// connection that was opened for this very operation and fails has nothing newer to offer.
template <typename Operation>
void Database::RunOnTheFileInPlace(Operation operation) {
    for (int attempt = 0; attempt < MAX_ATTEMPTS; ++attempt) {
        const bool isNew = !m_connection;
        if (isNew)
            Connect();
        try {
            operation(*m_connection);
            if (m_connection->IsInPlace())
                return;
        } catch (const SQLite::Exception& error) {
            if (!IsAboutTheFile(error.getErrorCode()) && m_connection->IsInPlace())
                throw;
            if (isNew) {
                m_connection.reset();
                throw;
            }
        }
        m_connection.reset();
    }
    throw SQLite::Exception("the database file is being replaced again and again", SQLITE_CANTOPEN);
}

void Database::Connect() {
    // SQLite would take an empty name for a database in memory, and a zero byte for the end of the name.
    if (m_path.empty() || m_path.find('\0') != std::string::npos)
        throw SQLite::Exception(sqlite3_errstr(SQLITE_CANTOPEN), SQLITE_CANTOPEN);
    m_connection = std::make_unique<Connection>(m_path, m_settings);
}

} // namespace OrvekSqlite
