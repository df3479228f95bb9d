#pragma once

#include <cstdint>

#include <sqlite3.h>

#include "Modules/OrvekSqlite/Settings.h"

namespace OrvekSqlite::guard {

/// What a statement is for. This decides what it may do.
enum class Permission {
    Own,         ///< the plug-in's own text (pragmas, BEGIN, COMMIT): may do anything
    CreateTable, ///< as Write, but it must create a table
    Write,       ///< changes data; an INSERT may hold nothing but literals and operators
    Read,        ///< a query
};

/// Checks the statements of one connection, when they are prepared and while they run.
///
/// The service deliberately builds its INSERT without escaping the texts of a report. So a report can end its
/// own literal and continue in SQL. This class limits what such SQL can do:
///
/// - No statement may attach a database, use a pragma, load an extension, open a transaction or make a
///   virtual table.
/// - An INSERT may hold only literals and operators. It may hold no function: `printf('%.*c',1000000000,'x')`
///   is a single step of the virtual machine, so no progress handler stops it. It may hold no sub-select: a
///   cross join can run for ever without a function or a recursion. It may hold no column of any table, so no
///   RETURNING and no upsert that reads. SQLite treats several rows in VALUES as a compound SELECT, so an
///   INSERT adds one row at most.
/// - A trigger that the table's owner made keeps working: what it does comes from the schema, not from the
///   statement.
/// - The limits on sizes and a progress handler bound everything else.
///
/// Threads: those of the connection. The object must not move while the connection lives.
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

    /// Call this after Begin: the statement is an INSERT that was let through when it was prepared.
    void ExpectInsert() { m_isInsert = true; }

    /// The statement is destroyed. What follows is the plug-in's own.
    void End() { Begin(Permission::Own); }

    /// Why the statement was refused or stopped, as a text for a person; null when it was not.
    const char* Refusal() const { return m_refusal; }

    /// Whether the statement that was prepared last creates a table.
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
    const char* m_refusal = nullptr; ///< always a literal, because the callbacks must not throw
    std::int64_t m_steps = 0;
    bool m_isInsert = false;
    bool m_didOtherThanInsert = false;
    bool m_createsTable = false;
};

} // namespace OrvekSqlite::guard
