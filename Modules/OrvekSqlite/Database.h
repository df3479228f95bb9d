#pragma once

#include <atomic>
#include <exception>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "Modules/OrvekSqlite/Settings.h"
#include "Modules/OrvekSqlite/file/LiveFile.h"
#include "Modules/OrvekSqlite/group/Committer.h"
#include "Modules/OrvekSqlite/group/Group.h"
#include "Plugin/ISqliteDatabase.h"

namespace OrvekSqlite {

/// The plug-in's object: one database file, opened when it can be and again when it must be.
///
/// Threads: operations one at a time, as the interface says; a second thread would wait. The object has a
/// thread of its own, the committer, from the first burst on. The child of a fork, which lacks that thread,
/// must leave the object alone.
///
/// Durability, of ExecSql: a statement that comes alone (nothing for 10 ms before it) is committed when
/// ExecSql returns. In a burst, statements share a transaction that is committed after at most 10 ms or 1,000
/// statements (or 4 MiB of their texts), by the committer when nothing follows. A statement's own error is
/// its own result, and leaves the others of the transaction alone. Every other operation on the database
/// commits first, and so does destruction; after CreateTable or BatExecSql returned true, its effect is
/// committed too. BatExecSql is one transaction: all of its statements or none.
///
/// What is committed survives the end of the process, kill -9 included, which so loses at most the last 10 ms
/// of a burst. A commit that fails loses nothing: the group's statements are kept and committed, in order,
/// once the database takes them, by the committer if nothing follows; new statements fail with the error text
/// meanwhile. They fail at once, but one in a tenth of a second tries to commit first; when another program's
/// lock is the reason, each of them waits for the lock. Kept are the group's texts, 5 MiB at most; they end
/// with the process.
///
/// Other programs: the write lock is free between groups. When another process has the file open, it stays
/// free for as long as the group held it, so that the other gets its turn. When another program has the lock,
/// the caller waits up to Settings::busyTimeout; its own queue grows meanwhile. The committer does not wait
/// for a lock, so it never keeps a caller waiting.
///
/// Failure: no operation throws. Each that returns false leaves its reason for GetLastErrorMsg, in SQLite's
/// own words when SQLite refused, in the guard's when the plug-in did ("not authorized: ..."). A failure
/// never deletes, replaces or creates the database file.
///
/// A file that is missing, damaged, read-only or replaced: every operation looks anew, so it works again as
/// soon as the file does, without a restart; within a burst every group looks. Statements that are not
/// committed when the file loses its name go to the file that takes its place; those that are committed are
/// the old file's and are not repeated there, but for a group in whose very commit the file was replaced.
///
/// What the statements may do stands in StatementGuard.h and Settings.h.
class Database final : public ISqliteDatabase {
public:
    explicit Database(Settings settings = {}) : m_settings(settings) {}

    /// Finish must have been called.
    ~Database() = default;

    /// Remembers `path` for all later operations, also when it cannot be opened now. An object that has
    /// another file open lets go of it.
    bool Open(const std::string& path) override;

    /// Runs one CREATE TABLE.
    bool CreateTable(const std::string& sql) override;

    /// Runs exactly one statement that returns no rows.
    bool ExecSql(const std::string& sql) override;

    bool BatExecSql(const std::vector<std::string>& sqls) override;

    /// Runs one query that changes nothing. On failure `rows` is as it was before.
    bool QuerySql(const std::string& sql, std::vector<std::vector<std::string>>& rows) override;

    /// The first cell of the first row, which must be an integer that fits an int. On failure `count` is left
    /// alone.
    bool GetTotalCount(const std::string& sql, int& count) override;

    /// Empty before the first failure.
    std::string GetLastErrorMsg() override;

    /// The end: commits what is kept, without waiting for another process's lock, stops the committer and
    /// closes the file. May be called from an exit handler on any thread, also from within an operation that
    /// crashed. Waits a fifth of a second at most for an operation to end; when it does not, a crash may cost
    /// the last 10 ms of a burst. The commit and the close take as long as the disk does.
    ///
    /// False: another thread may still be in an operation, or come back with the next. Then the object must
    /// stay where it is. An operation that is under way goes on; every operation that begins later fails.
    [[nodiscard]] bool Finish();

private:
    class Entry;

    bool RunAfterCommit(const file::LiveFile::Operation& operation);
    template <typename Action>
    bool KeepError(Action action);
    void Tell(const std::exception& error) noexcept;
    void TellNoMemory() noexcept;
    bool LockBefore(group::Clock::time_point deadline);

    const Settings m_settings;
    std::atomic<bool> m_isFinished = false; ///< set by Finish; every operation that begins later fails
    std::mutex m_mutex; ///< guards all below but the two thread ids; held throughout an operation
    file::LiveFile m_file{m_settings};
    group::Group m_group{m_file, m_settings.group};
    std::string m_lastError;
    std::atomic<std::thread::id> m_inside;     ///< the thread in an operation, if one is
    std::atomic<std::thread::id> m_lastInside; ///< the thread of the operation before
    group::Committer m_committer{m_mutex, m_group};
};

} // namespace OrvekSqlite
