#pragma once

#include <string>
#include <vector>

/// The local database that the plug-in libOrvekSqlite.dylib implements. The order of the operations is the
/// plug-in's binary interface.
///
/// Ownership: only the plug-in makes and destroys its objects ("CreateModule", "DestoryModule").
/// Threads: one thread at a time.
/// Failure: an operation that returns false has stored its reason for GetLastErrorMsg.
///
/// Durability: when a statement comes alone (no other statement in the 10 ms before it) and ExecSql returns
/// true, its effect survives kill -9. In a burst, statements share a transaction. The transaction is
/// committed after at most 10 ms or 1,000 statements, also when no further statement comes, so that kill -9
/// loses at most the last 10 ms of the burst. Only a single statement that itself runs longer delays the
/// commit. Every other operation on the database commits first.
///
/// Errors in a burst: a statement's own error is its own result and does not affect the others. A commit that
/// fails loses nothing: the plug-in keeps the statements and commits them, in order, once the database
/// accepts them. Until then, new statements fail with the error's text. A kept statement that a constraint
/// then refuses, after a change by another program, is dropped without a message.
///
/// Other programs: the write lock is free between transactions, and is held for one transaction at most.
class ISqliteDatabase {
public:
    /// Opens the SQLite database file at `path` for all later operations.
    virtual bool Open(const std::string& path) = 0;

    /// Runs a statement that creates a table.
    virtual bool CreateTable(const std::string& sql) = 0;

    /// Runs one statement that returns no rows.
    virtual bool ExecSql(const std::string& sql) = 0;

    /// Runs all statements in the order of the list, as one batch; false if the batch failed.
    virtual bool BatExecSql(const std::vector<std::string>& sqls) = 0;

    /// Runs a query and appends one vector per row to `rows`, one text per column, in column order. A NULL
    /// cell reads as empty text.
    virtual bool QuerySql(const std::string& sql, std::vector<std::vector<std::string>>& rows) = 0;

    /// Runs a counting statement and stores its number in `count`.
    virtual bool GetTotalCount(const std::string& sql, int& count) = 0;

    /// The text of the last failed operation's error.
    virtual std::string GetLastErrorMsg() = 0;

protected:
    ~ISqliteDatabase() = default;
};
