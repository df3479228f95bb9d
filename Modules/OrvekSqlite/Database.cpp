#include "Modules/OrvekSqlite/Database.h"

#include <limits>
#include <new>

#include <SQLiteCpp/Exception.h>

#include "SystemTool/Clock/LockBefore.h"

namespace OrvekSqlite {
namespace {

std::vector<std::string> CellsOf(const guard::Statement& statement) {
    std::vector<std::string> cells;
    const int columns = statement.ColumnCount();
    cells.reserve(static_cast<std::size_t>(columns));
    for (int column = 0; column < columns; ++column)
        cells.push_back(statement.Text(column));
    return cells;
}

int NumberIn(guard::Statement& statement) {
    if (!statement.NextRow() || sqlite3_column_type(statement.Handle(), 0) != SQLITE_INTEGER)
        throw SQLite::Exception("the counting statement returned no number", SQLITE_MISMATCH);
    const auto number = sqlite3_column_int64(statement.Handle(), 0);
    if (number < std::numeric_limits<int>::min() || number > std::numeric_limits<int>::max())
        throw SQLite::Exception("the number does not fit", SQLITE_RANGE);
    return static_cast<int>(number);
}

} // namespace

/// The time that one operation spends inside the object. It holds the lock and remembers the thread.
class Database::Entry {
public:
    explicit Entry(Database& database) : m_lock(database.m_mutex), m_database(database) {
        m_database.m_inside = m_database.m_lastInside = std::this_thread::get_id();
    }
    ~Entry() { m_database.m_inside = std::thread::id(); }

    Entry(const Entry&) = delete;
    Entry& operator=(const Entry&) = delete;

private:
    std::lock_guard<std::mutex> m_lock;
    Database& m_database;
};

bool Database::Open(const std::string& path) {
    const Entry entry(*this);
    // When the old file does not take the kept statements, they go to the new file: they were accepted, and
    // the new file is the store from now on.
    KeepError([&] { m_group.Commit(); });
    return KeepError([&] {
        m_file.Set(path);
        m_file.Run([](file::Connection&) {});
    });
}

bool Database::CreateTable(const std::string& sql) {
    const Entry entry(*this);
    // The kept statements come first. Their commit may fail because they need this very table; then they stay
    // kept.
    KeepError([&] { m_group.Commit(); });
    return KeepError([&] {
        m_file.Run([&](file::Connection& connection) {
            connection.Prepare(sql, guard::Permission::CreateTable).Execute();
        });
    });
}

bool Database::ExecSql(const std::string& sql) {
    const Entry entry(*this);
    const bool done = KeepError([&] { m_group.Execute(sql); });
    if (done)
        m_committer.Notice();
    return done;
}

bool Database::BatExecSql(const std::vector<std::string>& sqls) {
    return RunAfterCommit([&](file::Connection& connection) {
        connection.Begin();
        try {
            for (const auto& sql : sqls)
                connection.Execute(sql);
            connection.Commit();
        } catch (...) {
            connection.RollBack();
            throw;
        }
    });
}

bool Database::QuerySql(const std::string& sql, std::vector<std::vector<std::string>>& rows) {
    const auto before = rows.size();
    const bool done = RunAfterCommit([&](file::Connection& connection) {
        rows.resize(before);
        auto statement = connection.Prepare(sql, guard::Permission::Read);
        while (statement.NextRow())
            rows.push_back(CellsOf(statement));
    });
    if (!done)
        rows.resize(before);
    return done;
}

bool Database::GetTotalCount(const std::string& sql, int& count) {
    return RunAfterCommit([&](file::Connection& connection) {
        auto statement = connection.Prepare(sql, guard::Permission::Read);
        count = NumberIn(statement);
    });
}

std::string Database::GetLastErrorMsg() {
    const Entry entry(*this);
    return m_lastError;
}

bool Database::Finish() {
    // Set before the lock is taken: later operations then fail at once. Otherwise a thread that runs one
    // statement after the other would hardly ever leave the lock to us.
    m_isFinished = true;
    if (m_inside == std::this_thread::get_id() || m_committer.IsThisThread())
        return false; // this thread crashed in here, so its operation never ends
    const bool isOwnersThread =
        m_lastInside == std::thread::id() || m_lastInside == std::this_thread::get_id();
    auto lock = SystemTool::Clock::LockBefore(m_mutex, group::Clock::now() + m_settings.group.exitWait);
    if (!lock)
        return false;
    m_group.CommitWithoutWaiting();
    m_file.Close();
    lock.unlock();
    m_committer.Stop();
    return isOwnersThread;
}

bool Database::RunAfterCommit(const file::LiveFile::Operation& operation) {
    const Entry entry(*this);
    return KeepError([&] {
        m_group.Commit();
        m_file.Run(operation);
    });
}

/// The one place where failures become the text of GetLastErrorMsg.
template <typename Action>
bool Database::KeepError(Action action) {
    try {
        if (m_isFinished)
            throw SQLite::Exception("the database object is destroyed", SQLITE_MISUSE);
        action();
        return true;
    } catch (const std::bad_alloc&) {
        TellNoMemory();
    } catch (const std::exception& error) {
        Tell(error);
    }
    return false;
}

void Database::Tell(const std::exception& error) noexcept {
    try {
        m_lastError = error.what();
    } catch (const std::bad_alloc&) {
        TellNoMemory();
    }
}

void Database::TellNoMemory() noexcept {
    m_lastError = "out of memory"; // so short that it needs no memory itself
}

} // namespace OrvekSqlite
