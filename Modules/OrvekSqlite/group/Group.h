#pragma once

#include <exception>
#include <optional>
#include <string>

#include "Modules/OrvekSqlite/Settings.h"
#include "Modules/OrvekSqlite/file/LiveFile.h"
#include "Modules/OrvekSqlite/group/GroupPolicy.h"
#include "Modules/OrvekSqlite/group/KeptStatements.h"

namespace OrvekSqlite::group {

/// Runs single statements, and lets those of a burst share a transaction.
///
///     Empty ──── a statement in a burst ───→ Open ──── commit ───→ Empty
///                                             │
///                                             └─ failure ─→ Uncommitted ── run again and committed ─→ Empty
///
/// A statement that was accepted is kept as a text until it is committed.
///
/// Threads: one at a time.
/// Failure: throws; the kept statements stay kept.
class Group {
public:
    Group(file::LiveFile& file, const GroupSettings& settings) : m_file(file), m_policy(settings) {}

    /// Runs one statement. Throws the error of the statement.
    ///
    /// A statement that comes alone is committed when this returns. A statement in a burst joins the group.
    /// It is committed with the group, and is run again when that commit fails. A statement that fails leaves
    /// the group as it was.
    ///
    /// While the group is uncommitted, every statement is refused with the reason. Once in
    /// GroupSettings::retry, a statement tries to commit the group first, and is run when that works. When
    /// the reason is another program's lock, or a lack of memory, every statement tries; it also waits for
    /// the lock.
    ///
    /// After committed rows were lost, one statement is refused with the loss as its reason.
    void Execute(const std::string& sql);

    /// Commits the kept statements. Throws when that fails.
    void Commit();

    /// The same for the committer. It never waits for another program's lock. It does not throw, but keeps
    /// the reason.
    void CommitWithoutWaiting() noexcept;

    /// When to call Commit; nothing while the group is empty.
    std::optional<Clock::time_point> Due() const;

private:
    enum class State {
        Empty, ///< Nothing is kept.
        Open,  ///< We hold the write lock, and the transaction holds the effect of every kept statement.
        Uncommitted, ///< No transaction and no lock. The kept statements wait for the database to take them.
    };

    void ExecuteAlone(const std::string& sql);
    void ExecuteInGroup(const std::string& sql, Clock::time_point now);
    void RefuseWhileUncommitted(Clock::time_point now);
    void AfterFailedStatement() noexcept;
    void EndStatement(Clock::time_point now) noexcept;
    void Begin(file::Connection& connection);
    void RunAgain(file::Connection& connection);
    void TryToCommit() noexcept;
    void LeaveTheLockToOthers(Clock::time_point now) const;

    file::LiveFile& m_file;
    const GroupPolicy m_policy;
    KeptStatements m_kept;                   ///< accepted statements that are not known to be committed
    State m_state = State::Empty;            ///< the state of m_kept
    Clock::time_point m_began;               ///< while Open: when the transaction began
    std::optional<Clock::time_point> m_last; ///< when the last statement ended
    Clock::time_point m_freeUntil;           ///< the lock is left to others until then

    // About the last try to commit; used while the state is Uncommitted.
    Clock::time_point m_lastTry;
    std::exception_ptr m_reason; ///< why the try failed
    bool m_maySoonPass = false;  ///< whether the reason is another program's lock, or a lack of memory
};

} // namespace OrvekSqlite::group
