#include "Modules/OrvekSqlite/group/Group.h"

#include <thread>

#include <SQLiteCpp/Exception.h>

namespace OrvekSqlite::group {
namespace {

bool IsALock(const std::exception& error) {
    const auto* refusal = dynamic_cast<const SQLite::Exception*>(&error);
    return refusal != nullptr && refusal->getErrorCode() == SQLITE_BUSY;
}

} // namespace

void Group::Execute(const std::string& sql) {
    m_file.TellLoss(); // this statement's line is the one place where it can be told
    const bool isAlone = m_policy.IsAlone(m_last, Clock::now());
    try {
        RefuseWhileOwed();
        isAlone ? ExecuteAlone(sql) : ExecuteInGroup(sql);
    } catch (...) {
        EndStatement();
        throw;
    }
    EndStatement();
}

/// Commits a group that is complete, whatever became of the statement: a caller whose statements are all
/// refused takes the mutex again so quickly that the committer would get it too late.
void Group::EndStatement() noexcept {
    m_last = Clock::now();
    if (!m_kept.IsEmpty() && !IsUncommitted() &&
        m_policy.IsComplete(m_kept.Count(), m_kept.Bytes(), m_began, *m_last))
        TryToCommit();
}

void Group::ExecuteAlone(const std::string& sql) {
    Commit();
    m_file.Run([&](file::Connection& connection) {
        connection.RequireInPlace();
        connection.Execute(sql);
    });
}

void Group::ExecuteInGroup(const std::string& sql) {
    m_kept.Reserve(sql);
    if (!m_file.InTransaction())
        LeaveTheLockToOthers();
    try {
        m_file.Run([&](file::Connection& connection) {
            Open(connection);
            connection.Execute(sql);
        });
    } catch (...) {
        if (m_kept.IsEmpty())
            m_file.RollBack(); // a group of nothing holds no lock
        else if (IsUncommitted())
            TryToCommit(); // a full disk or a trigger's RAISE(ROLLBACK) undid the others, too
        throw;
    }
    m_kept.Add(sql);
}

/// A lock is waited for as ever, though the committer, which does not wait, has met it.
void Group::RefuseWhileOwed() {
    if (!IsUncommitted())
        return;
    if (!m_metALock && Clock::now() < m_policy.NextTry(m_lastTry))
        throw SQLite::Exception(m_failure, SQLITE_BUSY);
    Commit();
}

void Group::Commit() {
    if (m_kept.IsEmpty())
        return;
    try {
        m_file.Run([&](file::Connection& connection) {
            Open(connection);
            connection.RequireInPlace();
            connection.Commit();
        });
    } catch (const std::exception& error) {
        m_file.RollBack(); // the lock is for those who may be able to do something about it
        m_lastTry = Clock::now();
        m_metALock = IsALock(error);
        m_failure = error.what();
        throw;
    }
    m_kept.Clear();
    const auto now = Clock::now();
    m_freeUntil = m_file.IsShared() ? now + m_policy.Pause(now - m_began) : now;
}

std::optional<Clock::time_point> Group::Due() const {
    if (m_kept.IsEmpty())
        return std::nullopt;
    return IsUncommitted() ? m_policy.NextTry(m_lastTry) : m_policy.Due(m_began);
}

/// Begins the transaction, unless it is open, and brings it to where the kept statements had it.
void Group::Open(file::Connection& connection) {
    if (connection.InTransaction())
        return;
    connection.Begin();
    m_began = Clock::now();
    try {
        RunAgain(connection);
    } catch (...) {
        connection.RollBack();
        throw;
    }
}

/// A statement that a constraint refuses now, in another file or after another program's change, is dropped,
/// as it would have been had it come now: kept, it would be in the way of all others for ever. Any other
/// error, a missing table for one, can be remedied and is waited for.
void Group::RunAgain(file::Connection& connection) {
    for (std::size_t i = 0; i < m_kept.Count();) {
        try {
            connection.Execute(m_kept[i]);
            ++i;
        } catch (const SQLite::Exception& error) {
            if (error.getErrorCode() != SQLITE_CONSTRAINT)
                throw;
            m_kept.Remove(i);
            if (!connection.InTransaction()) { // a trigger rolled back what was before it, too
                connection.Begin();
                i = 0;
            }
        }
    }
}

void Group::TryToCommit() noexcept {
    try {
        Commit();
    } catch (...) { // kept, with the reason, for the next try
    }
}

void Group::LeaveTheLockToOthers() {
    if (Clock::now() < m_freeUntil)
        std::this_thread::sleep_until(m_freeUntil);
}

} // namespace OrvekSqlite::group
