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

inline SQLite::Transaction WriteTransaction(SQLite::Database& database) {
    // A deferred one could fail in its middle when another process writes between its read and its write.
    return SQLite::Transaction(database, SQLite::TransactionBehavior::IMMEDIATE);
}

} // namespace MetrikSdk::outbox
