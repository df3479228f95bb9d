#pragma once

#include <string>

#include <SQLiteCpp/SQLiteCpp.h>
#include <sqlite3.h>

#include "Modules/MetrikSdk/outbox/StoreError.h"
#include "Modules/Sqlite/ErrorKind.h"

// Helpers that every operation of the store puts around its SQL.
namespace MetrikSdk::outbox {

/// What the holder of the store must do about an error of SQLite.
inline StoreFault FaultOf(const SQLite::Exception& error) {
    switch (Sqlite::KindOf(error.getErrorCode())) {
    case Sqlite::ErrorKind::Wait:
        return StoreFault::TryLater;
    case Sqlite::ErrorKind::Damage:
        return StoreFault::SetAside;
    case Sqlite::ErrorKind::Reopen:
    case Sqlite::ErrorKind::Statement: // our own statement should have worked
        break;
    }
    return StoreFault::Reopen;
}

/// Runs one operation of the store. Turns exceptions of SQLite into StoreError.
template <typename Operation>
auto Guarded(const char* what, Operation operation) {
    try {
        return operation();
    } catch (const SQLite::Exception& error) {
        throw StoreError(FaultOf(error), std::string(what) + ": " + error.what());
    }
}

/// Resets a statement after its use, also when it fails. A statement that is left in the middle would hold
/// its read lock, and the log could never be checkpointed again.
class Use {
public:
    explicit Use(SQLite::Statement& statement) : m_statement(statement) {}
    ~Use() { m_statement.tryReset(); }
    Use(const Use&) = delete;
    Use& operator=(const Use&) = delete;
    SQLite::Statement* operator->() const { return &m_statement; }

private:
    SQLite::Statement& m_statement;
};

/// A transaction that has the write lock from its beginning. A deferred transaction could fail in the middle,
/// when another process writes between its read and its write. The destructor rolls back unless Commit
/// succeeded. Without memory that can fail: the transaction stays open, and its connection must be closed.
/// (The library's own transaction would end the process then, because its destructor throws.)
class WriteTransaction {
public:
    explicit WriteTransaction(SQLite::Database& database) : m_database(database) {
        m_database.exec("BEGIN IMMEDIATE");
    }
    ~WriteTransaction() {
        if (!m_isCommitted)
            ::sqlite3_exec(m_database.getHandle(), "ROLLBACK", nullptr, nullptr, nullptr);
    }
    WriteTransaction(const WriteTransaction&) = delete;
    WriteTransaction& operator=(const WriteTransaction&) = delete;

    void Commit() {
        m_database.exec("COMMIT");
        m_isCommitted = true;
    }

private:
    SQLite::Database& m_database;
    bool m_isCommitted = false;
};

} // namespace MetrikSdk::outbox
