#pragma once

#include <string>
#include <vector>

#include "Plugin/ISqliteDatabase.h"

namespace SyncServiceReport {

/// The only access point for SQL on the report database. It passes statements to the SQLite plug-in
/// unchanged, and logs each failure in one form: the plug-in's error text, a hyphen, the statement.
/// BatExecSql logs the error text alone.
///
/// Ownership: keeps the plug-in's object without owning it. After the plug-in's loader is destroyed, no
/// function of this class may be called.
///
/// Threads: no lock; one thread at a time. Only instance may be called by several threads at once.
///
/// Failure: an operation returns false. Each failure of the plug-in is logged as one Error line. Without a
/// plug-in's object, nothing is logged. An exception that the plug-in throws goes to the caller.
class DBHelper {
public:
    static DBHelper& instance();

    /// Closes and releases nothing, because this class does not own the database.
    virtual ~DBHelper() = default;

    DBHelper(const DBHelper&) = delete;
    DBHelper& operator=(const DBHelper&) = delete;

    /// Uses this object of the plug-in from now on; always true.
    bool Init(ISqliteDatabase* db);

    /// Whether there is an object to call.
    bool HasDatabase() const { return m_pSqliteDb != nullptr; }

    bool CreateTable(const std::string& sql);
    bool ExecSql(const std::string& sql) const;

    /// Replaces the content of `rows`; empties it even when the query is not run. True only when at least one
    /// row came back. No row and a failed query are one result, because the caller has nothing to use in both
    /// cases.
    bool QuerySql(const std::string& sql, std::vector<std::vector<std::string>>& rows);

    /// Tries up to three times, with a pause of one second after each failure, also after the last.
    bool BatExecSql(std::vector<std::string> sqls);

    /// Call it only after Init with an object: unlike the other functions, it does not test whether there is
    /// one. `count` becomes 0 first. After a failure, it is what the plug-in left in it.
    bool GetTotalCount(const std::string& sql, int& count);

private:
    DBHelper() = default;

    bool Report(const char* function, int line, const std::string& sql) const;

    ISqliteDatabase* m_pSqliteDb = nullptr;
};

} // namespace SyncServiceReport
