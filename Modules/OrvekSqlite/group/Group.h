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
/// A statement that was accepted is kept, as its text, until it is committed.
///
/// Threads: one at a time.
/// Failure: throws; what is kept stays kept.
class Group {
public:
    Group(file::LiveFile& file, const GroupSettings& settings) : m_file(file), m_policy(settings) {}

    /// Runs one statement, and throws its error.
    ///
    /// A statement that comes alone is committed when this returns. In a burst it joins the group: it is
    /// committed with the group, and run again if that fails. Its own error leaves the group as it was.
    ///
    /// While the group is uncommitted, every statement is refused with the reason. Once in
    /// GroupSettings::retry one of them tries to commit the group first, and is run if that works. If another
    /// program's lock is the reason, each of them tries, and waits for the lock.
    ///
    /// After rows were lost, one statement is refused with that for its reason.
    void Execute(const std::string& sql);

    /// Commits what is kept. Throws when that failed.
    void Commit();

    /// The same for the committer: never waits for another program's lock, and keeps the reason of a failure.
    void CommitWithoutWaiting() noexcept;

    /// When Commit is to be called; nothing while the group is empty.
    std::optional<Clock::time_point> Due() const;

private:
    enum class State {
        Empty, ///< Nothing is kept.
        Open,  ///< We hold the write lock, and the transaction holds the effect of every statement kept.
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
    KeptStatements m_kept;                   ///< accepted, and not known to be committed
    State m_state = State::Empty;            ///< of m_kept
    Clock::time_point m_began;               ///< while Open: when the transaction began
    std::optional<Clock::time_point> m_last; ///< end of the statement before
    Clock::time_point m_freeUntil;           ///< others may have the lock until then

    // While Uncommitted: the last try to commit.
    Clock::time_point m_lastTry;
    std::exception_ptr m_reason; ///< why it failed
    bool m_maySoonPass = false;  ///< whether that is another program's lock, or no memory
};

} // namespace OrvekSqlite::group
