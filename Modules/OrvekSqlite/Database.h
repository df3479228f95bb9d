#pragma once

#include <memory>
#include <string>
#include <vector>

#include "Modules/OrvekSqlite/Connection.h"
#include "Modules/OrvekSqlite/Settings.h"
#include "Plugin/ISqliteDatabase.h"

namespace OrvekSqlite {

/// The plug-in's object: one database file, opened when it can be and again when it must be.
///
/// Threads: one at a time.
///
/// Durability: after ExecSql, CreateTable or BatExecSql returned true, its effect survives the end of the
/// process, kill -9 included. BatExecSql is one transaction: all of its statements or none.
///
/// Failure: no operation throws. Each that returns false leaves its reason for GetLastErrorMsg, in SQLite's
/// own words when SQLite refused, in the guard's when the plug-in did ("not authorized: ..."). A failure
/// never deletes, replaces or creates the database file.
///
/// A file that is missing, damaged, read-only or replaced: every operation looks anew, so it works again as
/// soon as the file does, without a restart. A row that was written while the file lost its name is written
/// once more into the file that took its place.
///
/// What the statements may do stands in StatementGuard.h and Settings.h.
class Database final : public ISqliteDatabase {
public:
    explicit Database(Settings settings = {}) : m_settings(settings) {}

    /// Remembers `path` for all later operations, also when it cannot be opened now. An object that has
    /// another file open lets go of it.
    bool Open(const std::string& path) override;

    /// Runs one CREATE TABLE.
    bool CreateTable(const std::string& sql) override;

    /// Runs exactly one statement that returns no rows.
    bool ExecSql(const std::string& sql) override;

    bool BatExecSql(const std::vector<std::string>& sqls) override;

    /// Runs one query that changes nothing. On failure `rows` is as it was before.
    bool QuerySql(const std::string& sql, std::vector<std::vector<std::string>>& rows) override;

    /// The first cell of the first row, which must be an integer that fits an int. On failure `count` is left
    /// alone.
    bool GetTotalCount(const std::string& sql, int& count) override;

    /// Empty before the first failure.
    std::string GetLastErrorMsg() override { return m_lastError; }

private:
    template <typename Operation>
    bool Run(Operation operation);
    template <typename Operation>
    void RunOnTheFileInPlace(Operation operation);
    void Connect();

    Settings m_settings;
    std::string m_path;
    std::unique_ptr<Connection> m_connection; ///< null: to be opened by the next operation
    std::string m_lastError;
};

} // namespace OrvekSqlite
