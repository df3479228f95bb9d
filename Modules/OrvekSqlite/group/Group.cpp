#include "Modules/OrvekSqlite/group/Group.h"

#include <thread>

#include <SQLiteCpp/Exception.h>

namespace OrvekSqlite::group {
namespace {

/// Whether the reason of a failure may soon be gone. Another program's lock can be waited for. Memory may be
/// free again for the next statement.
bool MaySoonPass(const std::exception& error) {
    const auto* refusal = dynamic_cast<const SQLite::Exception*>(&error);
    return refusal == nullptr || refusal->getErrorCode() == SQLITE_BUSY ||
           refusal->getErrorCode() == SQLITE_NOMEM;
}

} // namespace

void Group::Execute(const std::string& sql) {
    // This plug-in cannot log, but the service logs the error of a refused statement. So one statement is
    // refused to report the loss.
    m_file.TellLoss();
    const auto now = Clock::now();
    try {
        RefuseWhileUncommitted(now);
        m_policy.IsAlone(m_last, now) ? ExecuteAlone(sql) : ExecuteInGroup(sql, now);
    } catch (...) {
        EndStatement(Clock::now());
        throw;
    }
    EndStatement(Clock::now());
}

void Group::RefuseWhileUncommitted(Clock::time_point now) {
    if (m_state != State::Uncommitted)
        return;
    if (!m_policy.MayTry(m_lastTry, m_maySoonPass, now))
        std::rethrow_exception(m_reason);
    Commit();
}

void Group::ExecuteAlone(const std::string& sql) {
    Commit();
    m_file.Run([&](file::Connection& connection) { connection.Execute(sql); });
}

void Group::ExecuteInGroup(const std::string& sql, Clock::time_point now) {
    m_kept.Reserve(sql);
    if (m_state != State::Open)
        LeaveTheLockToOthers(now);
    try {
        m_file.Run([&](file::Connection& connection) {
            Begin(connection);
            connection.Execute(sql);
        });
    } catch (...) {
        AfterFailedStatement();
        throw;
    }
    m_kept.Add(sql);
    m_state = State::Open;
}

/// Usually the transaction is unchanged. But a full disk, or RAISE(ROLLBACK) in a trigger, ends the whole
/// transaction. Then the statements before this one are run again and committed at once.
void Group::AfterFailedStatement() noexcept {
    if (m_kept.IsEmpty()) {
        m_file.RollBack(); // an empty group must not hold the lock
        m_state = State::Empty;
    } else if (!m_file.InTransaction()) {
        TryToCommit();
    }
}

/// Commits a complete group, also after a statement that was refused. The committer alone would be too late:
/// a caller whose statements are all refused takes the mutex again so quickly that the committer hardly gets
/// it.
void Group::EndStatement(Clock::time_point now) noexcept {
    m_last = now;
    if (m_state == State::Open && m_policy.IsComplete(m_kept.Count(), m_kept.Bytes(), m_began, now))
        TryToCommit();
}

void Group::Commit() {
    if (m_state == State::Empty)
        return;
    try {
        m_file.Run([&](file::Connection& connection) {
            Begin(connection);
            connection.Commit();
        });
    } catch (const std::exception& error) {
        m_file.RollBack(); // gives the lock free: another program may need it to remove the reason
        m_state = State::Uncommitted;
        m_lastTry = Clock::now();
        m_reason = std::current_exception();
        m_maySoonPass = MaySoonPass(error);
        throw;
    }
    m_kept.Clear();
    m_state = State::Empty;
    const auto now = Clock::now();
    m_freeUntil = m_file.IsShared() ? now + m_policy.Pause(now - m_began) : now;
}

void Group::TryToCommit() noexcept {
    try {
        Commit();
    } catch (...) { // the group keeps the reason for the next try
    }
}

void Group::CommitWithoutWaiting() noexcept {
    m_file.WithoutWaiting([this] { TryToCommit(); });
}

std::optional<Clock::time_point> Group::Due() const {
    switch (m_state) {
    case State::Empty:
        return std::nullopt;
    case State::Open:
        return m_policy.Due(m_began);
    case State::Uncommitted:
        break;
    }
    return m_policy.NextTry(m_lastTry);
}

/// Begins a transaction, unless one is open, and runs the kept statements in it again.
void Group::Begin(file::Connection& connection) {
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

/// Drops a statement that a constraint refuses now, in another file or after another program's change. If it
/// came now for the first time, it would be refused as well. If it were kept, all other statements would wait
/// for it for ever. Any other error, such as a missing table, can be remedied, so the group waits.
void Group::RunAgain(file::Connection& connection) {
    for (std::size_t i = 0; i < m_kept.Count();) {
        try {
            connection.Execute(m_kept[i]);
            ++i;
        } catch (const SQLite::Exception& error) {
            if (error.getErrorCode() != SQLITE_CONSTRAINT)
                throw;
            m_kept.Remove(i);
            if (!connection.InTransaction()) { // a trigger has rolled back the statements before it, too
                connection.Begin();
                i = 0;
            }
        }
    }
}

void Group::LeaveTheLockToOthers(Clock::time_point now) const {
    if (now < m_freeUntil)
        std::this_thread::sleep_until(m_freeUntil);
}

} // namespace OrvekSqlite::group
