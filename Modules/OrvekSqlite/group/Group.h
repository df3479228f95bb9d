#pragma once

#include <optional>
#include <string>

#include "Modules/OrvekSqlite/Settings.h"
#include "Modules/OrvekSqlite/file/LiveFile.h"
#include "Modules/OrvekSqlite/group/GroupPolicy.h"
#include "Modules/OrvekSqlite/group/KeptStatements.h"

namespace OrvekSqlite::group {

/// Runs single statements, and lets those of a burst share a transaction.
///
///     nothing kept ── a statement in a burst ──→ open ── commit ──→ nothing kept
///                                                 │                      ↑
///                                                 └─ failure → uncommitted ┘ run again and committed
///
/// Open: the write lock is ours, and the transaction holds the effect of every statement kept. Uncommitted: no
/// transaction, the lock is free, and the kept statements wait for the database to take them. Which of the
/// two it is, SQLite says (LiveFile::InTransaction): it ends a transaction by itself on some errors.
///
/// Threads: one at a time.
/// Failure: throws; a statement that was accepted is kept until it is committed.
class Group {
public:
    Group(file::LiveFile& file, const GroupSettings& settings) : m_file(file), m_policy(settings) {}

    /// Runs one statement. Alone, it is committed when this returns. In a burst it joins a group, and is
    /// committed with it; should that fail, it is run again. Its own error is thrown and leaves the group as
    /// it was. While a group is uncommitted, this throws the reason, but for one try every GroupSettings::retry; when
    /// the reason is another program's lock, it waits for that. After rows were lost, one statement is refused with that
    /// for its reason.
    void Execute(const std::string& sql);

    /// Commits what is kept, if anything.
    void Commit();

    /// When Commit is to be called; nothing while nothing is kept.
    std::optional<Clock::time_point> Due() const;

private:
    void ExecuteAlone(const std::string& sql);
    void ExecuteInGroup(const std::string& sql);
    void RefuseWhileOwed();
    void EndStatement() noexcept;
    void Open(file::Connection& connection);
    void RunAgain(file::Connection& connection);
    void TryToCommit() noexcept;
    void LeaveTheLockToOthers();
    bool IsUncommitted() const { return !m_kept.IsEmpty() && !m_file.InTransaction(); }

    file::LiveFile& m_file;
    const GroupPolicy m_policy;
    KeptStatements m_kept; ///< accepted, and not known to be committed
    Clock::time_point m_began;
    std::optional<Clock::time_point> m_last; ///< end of the statement before
    Clock::time_point m_freeUntil;           ///< others may have the lock until then
    Clock::time_point m_lastTry;             ///< to commit, which failed with m_failure
    std::string m_failure;
    bool m_metALock = false; ///< whether m_failure is another program's lock
};

} // namespace OrvekSqlite::group
