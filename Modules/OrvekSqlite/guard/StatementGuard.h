#pragma once

#include <cstdint>

#include <sqlite3.h>

#include "Modules/OrvekSqlite/Settings.h"

namespace OrvekSqlite::guard {

/// What a statement is for, which decides what it may do.
enum class Permission {
    Own,         ///< the plug-in's own text (pragmas, BEGIN, COMMIT): anything
    CreateTable, ///< as Write, and a table must be what it creates
    Write,       ///< one that changes data; an INSERT may hold nothing but literals and operators
    Read,        ///< a query
};

/// Stands between a statement's text and SQLite, for one connection.
///
/// The service builds its INSERT without escaping what a report says, deliberately, so a report can end its
/// own literal and continue in SQL. This is where that ends:
///
/// - No statement may attach a database, use a pragma, load an extension, open a transaction or make a virtual
///   table.
/// - An INSERT may hold only literals and operators. No function: `printf('%.*c',1000000000,'x')` is a single
///   step of the virtual machine and so passes any progress handler. No sub-select: a cross join needs
///   neither function nor recursion to run for ever. No column of any table, so no RETURNING and no upsert
///   that reads. Several rows in VALUES are a compound SELECT to SQLite, so an INSERT adds one row at most.
/// - A trigger that the table's owner put there keeps working: what its body does comes from the schema, not
///   from the statement.
/// - What is left is bounded by the limits on sizes and by a progress handler.
///
/// Threads: those of the connection. Must stay where it is while the connection lives.
class StatementGuard {
public:
    StatementGuard() = default;
    ~StatementGuard() = default;
    StatementGuard(const StatementGuard&) = delete;
    StatementGuard& operator=(const StatementGuard&) = delete;

    /// Puts the guard on `connection`. Until the first Begin, everything is allowed.
    void Install(sqlite3* connection, const Limits& limits);

    /// A statement of this kind is prepared and run from here on.
    void Begin(Permission permission);

    /// After Begin: the statement is an INSERT that was let through when it was prepared.
    void ExpectInsert() { m_isInsert = true; }

    /// The statement is gone; what follows is the plug-in's own.
    void End() { Begin(Permission::Own); }

    /// Why the statement was refused or stopped, for a person; null when it was not.
    const char* Refusal() const { return m_refusal; }

    /// Whether the statement prepared last creates a table.
    bool CreatesTable() const { return m_createsTable; }

private:
    static int OnAction(void* self, int action, const char* first, const char* second, const char* database,
                        const char* trigger);
    static int OnProgress(void* self);

    bool IsAllowed(int action, const char* first, const char* second, const char* trigger);
    bool IsAllowedBesideInsert(int action);
    bool Refuse(const char* reason);
    std::int64_t StepBudget() const;

    Limits m_limits;
    Permission m_permission = Permission::Own;
    const char* m_refusal = nullptr; ///< always a literal: the callbacks must not throw
    std::int64_t m_steps = 0;
    bool m_isInsert = false;
    bool m_didOtherThanInsert = false;
    bool m_createsTable = false;
};

} // namespace OrvekSqlite::guard
