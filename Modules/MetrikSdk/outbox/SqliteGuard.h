#pragma once

#include <string>

#include <SQLiteCpp/SQLiteCpp.h>
#include <sqlite3.h>

#include "Modules/MetrikSdk/outbox/StoreError.h"
#include "Modules/Sqlite/ErrorKind.h"

// What every operation of the store does around its SQL.
namespace MetrikSdk::outbox {

/// What the holder of the store does about an error of SQLite's.
inline StoreFault FaultOf(const SQLite::Exception& error) {
    switch (Sqlite::KindOf(error.getErrorCode())) {
    case Sqlite::ErrorKind::Wait:
        return StoreFault::TryLater;
    case Sqlite::ErrorKind::Damage:
        return StoreFault::SetAside;
    case Sqlite::ErrorKind::Reopen:
    case Sqlite::ErrorKind::Statement: // the statements are ours, so this one should have worked
        break;
    }
    return StoreFault::Reopen;
}

/// Runs one operation of the store, with SQLite's failures turned into ours.
template <typename Operation>
auto Guarded(const char* what, Operation operation) {
    try {
        return operation();
    } catch (const SQLite::Exception& error) {
        throw StoreError(FaultOf(error), std::string(what) + ": " + error.what());
    }
}

/// Leaves a statement ready for its next use also when it fails: one that was left in the middle would hold
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

/// A transaction that has the write lock from its beginning: a deferred one could fail in its middle when
/// another process writes between its read and its write. Undone unless it is committed, but for want of
/// memory: then it stays open, and its connection is to be closed. (The library's own ends the process then:
/// its destructor throws.)
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
