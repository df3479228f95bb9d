#pragma once

#include <string>
#include <vector>

/// The local database that the plug-in libOrvekSqlite.dylib implements. The order of the operations is the
/// plug-in's binary interface.
///
/// Ownership: objects are made and destroyed by their plug-in alone ("CreateModule", "DestoryModule").
/// Threads: one thread at a time.
/// Failure: an operation that returns false has left its reason for GetLastErrorMsg.
/// Durability: after ExecSql returned true for a statement that came alone (nothing for 10 ms before it), its
/// effect survives kill -9. In a burst, statements share a transaction that is committed after at most 10 ms
/// or 1,000 statements, also when nothing follows, so that kill -9 loses at most the last 10 ms of the burst;
/// a statement that runs for longer by itself holds its transaction up. A statement's own error is its own
/// result and leaves the others alone. A commit that fails loses nothing: the statements are kept and
/// committed, in order, once the database takes them, and new ones fail with the error's text meanwhile; one
/// that a constraint refuses then, after another program's change, is dropped without a word. Every other
/// operation on the database commits first.
/// Other programs: the write lock is free between transactions, and held for one of them at the longest.
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
