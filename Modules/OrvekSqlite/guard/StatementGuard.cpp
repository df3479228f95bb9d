#include "Modules/OrvekSqlite/guard/StatementGuard.h"

#include <limits>
#include <string_view>

namespace OrvekSqlite::guard {
namespace {

/// Steps of the virtual machine between two checks of the budget. An INSERT takes fewer, so it is never
/// checked.
constexpr int STEPS_PER_LOOK = 1000;

const char* ForbiddenToAll(int action, const char* function) {
    switch (action) {
    case SQLITE_ATTACH:
    case SQLITE_DETACH:
        return "not authorized: attaching or detaching a database";
    case SQLITE_PRAGMA:
        return "not authorized: a pragma";
    case SQLITE_TRANSACTION:
    case SQLITE_SAVEPOINT:
        return "not authorized: a transaction of the statement's own";
    case SQLITE_CREATE_VTABLE:
    case SQLITE_DROP_VTABLE:
        return "not authorized: a virtual table";
    case SQLITE_FUNCTION:
        if (function != nullptr && sqlite3_stricmp(function, "load_extension") == 0)
            return "not authorized: loading an extension";
        return nullptr;
    default:
        return nullptr;
    }
}

/// SQLite runs CREATE and similar statements as inserts into its own table of contents.
bool IsTableOfContents(const char* table) {
    const std::string_view name = table != nullptr ? table : "";
    return name == "sqlite_master" || name == "sqlite_temp_master";
}

void SetLimits(sqlite3* connection, const Limits& limits) {
    sqlite3_limit(connection, SQLITE_LIMIT_LENGTH, limits.valueBytes);
    sqlite3_limit(connection, SQLITE_LIMIT_SQL_LENGTH, limits.sqlBytes);
    sqlite3_limit(connection, SQLITE_LIMIT_EXPR_DEPTH, limits.expressionDepth);
    sqlite3_limit(connection, SQLITE_LIMIT_VDBE_OP, limits.instructions);
    sqlite3_limit(connection, SQLITE_LIMIT_LIKE_PATTERN_LENGTH, limits.likePatternBytes);
    sqlite3_limit(connection, SQLITE_LIMIT_TRIGGER_DEPTH, limits.triggerDepth);
    sqlite3_limit(connection, SQLITE_LIMIT_ATTACHED, 0);
    sqlite3_limit(connection, SQLITE_LIMIT_VARIABLE_NUMBER, 0); // the text of a statement has no parameters
    sqlite3_limit(connection, SQLITE_LIMIT_WORKER_THREADS, 0);
}

} // namespace

void StatementGuard::Install(sqlite3* connection, const Limits& limits) {
    m_limits = limits;
    SetLimits(connection, limits);
    sqlite3_set_authorizer(connection, &StatementGuard::OnAction, this);
    sqlite3_progress_handler(connection, STEPS_PER_LOOK, &StatementGuard::OnProgress, this);
}

void StatementGuard::Begin(Permission permission) {
    m_permission = permission;
    m_refusal = nullptr;
    m_steps = 0;
    m_isInsert = false;
    m_didOtherThanInsert = false;
    m_createsTable = false;
}

int StatementGuard::OnAction(void* self, int action, const char* first, const char* second,
                             const char* /*database*/, const char* trigger) {
    return static_cast<StatementGuard*>(self)->IsAllowed(action, first, second, trigger) ? SQLITE_OK
                                                                                         : SQLITE_DENY;
}

bool StatementGuard::IsAllowed(int action, const char* first, const char* second, const char* trigger) {
    if (m_permission == Permission::Own)
        return true;
    if (const auto* reason = ForbiddenToAll(action, second))
        return Refuse(reason);
    if (trigger != nullptr)
        return true;
    if (action == SQLITE_INSERT && !IsTableOfContents(first)) {
        // SQLite reports the insert before anything inside it. If a later version does not, the statement is
        // refused and not let through.
        m_isInsert = true;
        return !m_didOtherThanInsert || Refuse("not authorized: an INSERT within another statement");
    }
    m_createsTable |= action == SQLITE_CREATE_TABLE;
    m_didOtherThanInsert = true;
    return !m_isInsert || IsAllowedBesideInsert(action);
}

bool StatementGuard::IsAllowedBesideInsert(int action) {
    switch (action) {
    case SQLITE_SELECT:
    case SQLITE_RECURSIVE:
        return Refuse("not authorized: a sub-select or further rows in an INSERT");
    case SQLITE_FUNCTION:
        return Refuse("not authorized: a function in an INSERT");
    case SQLITE_READ:
        return Refuse("not authorized: reading a table in an INSERT");
    case SQLITE_UPDATE:
    case SQLITE_DELETE:
        return Refuse("not authorized: changing other rows in an INSERT");
    default:
        return Refuse("not authorized: an INSERT may hold only literals and operators");
    }
}

bool StatementGuard::Refuse(const char* reason) {
    if (m_refusal == nullptr)
        m_refusal = reason;
    return false;
}

std::int64_t StatementGuard::StepBudget() const {
    if (m_permission == Permission::Own)
        return std::numeric_limits<std::int64_t>::max();
    return m_isInsert ? m_limits.insertSteps : m_limits.statementSteps;
}

int StatementGuard::OnProgress(void* self) {
    auto& guard = *static_cast<StatementGuard*>(self);
    guard.m_steps += STEPS_PER_LOOK;
    if (guard.m_steps <= guard.StepBudget())
        return 0;
    guard.Refuse("interrupted: the statement does more work than is allowed");
    return 1;
}

} // namespace OrvekSqlite::guard
