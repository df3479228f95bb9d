#pragma once

#include <string>
#include <vector>

#include "Plugin/ISqliteDatabase.h"

namespace SyncServiceReport {

/// The one access point for SQL on the report database. Passes statements to the SQLite plug-in unchanged and
/// gives failures one form in the log: the plug-in's error text, a hyphen, the statement.
///
/// Ownership: holds the plug-in's object without owning it. After the plug-in's loader is gone, nothing may
/// be called.
///
/// Threads: no lock; one thread at a time. Only the first call of instance may come from several at once.
///
/// Failure: false, with one Error line for each failure of the plug-in; false and no line while there is no
/// plug-in. Exceptions of the plug-in itself go to the caller.
class DBHelper {
public:
    static DBHelper& instance();

    /// Closes and releases nothing: the database is not this class's.
    virtual ~DBHelper() = default;

    DBHelper(const DBHelper&) = delete;
    DBHelper& operator=(const DBHelper&) = delete;

    /// Takes the plug-in's object from now on; always true.
    bool Init(ISqliteDatabase* db);

    /// Whether there is an object to call.
    bool HasDatabase() const { return m_pSqliteDb != nullptr; }

    bool CreateTable(const std::string& sql);
    bool ExecSql(const std::string& sql) const;

    /// Replaces the content of `rows`, which is emptied even when the query is not run. True only when at
    /// least one row came back: callers have nothing to use either way, so no row and no answer are one
    /// result.
    bool QuerySql(const std::string& sql, std::vector<std::vector<std::string>>& rows);

    /// Tries up to three times, each failure followed by a pause of one second, the last one too.
    bool BatExecSql(std::vector<std::string> sqls);

    /// Only after Init with an object: unlike the others it does not ask whether there is one. `count`
    /// becomes 0 first, and on failure is what the plug-in left in it.
    bool GetTotalCount(const std::string& sql, int& count);

private:
    DBHelper() = default;

    bool Report(const char* function, int line, const std::string& sql) const;

    ISqliteDatabase* m_pSqliteDb = nullptr;
};

} // namespace SyncServiceReport
