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

/// The plug-in's object: one database file. It is opened as soon as that works, and again when it was
/// replaced.
///
/// Threads: call one operation at a time, as the interface says; a second thread would wait. From the first
/// burst on, the object has a thread of its own, the committer. The child of a fork does not have that
/// thread, so it must not use the object.
///
/// Durability of ExecSql: a statement that comes alone (no other one in the 10 ms before it) is committed
/// when ExecSql returns. In a burst, statements share a transaction. It is committed after at most 10 ms,
/// 1,000 statements or 4 MiB of their texts; when no further statement comes, the committer commits it. A
/// statement that fails returns false, and the other statements of the transaction keep their effect. Every
/// other operation on the database commits the transaction first, and so does destruction. After CreateTable
/// or BatExecSql returned true, its effect is committed, too. BatExecSql is one transaction: all of its
/// statements take effect, or none.
///
/// What is committed survives the end of the process, kill -9 included. So kill -9 loses at most the last 10
/// ms of a burst. A commit that fails loses nothing: the statements of the group are kept, and are committed
/// in order as soon as the database takes them. When no further statement comes, the committer does that.
/// Meanwhile new statements fail with the error text. They fail at once, but ten times a second one of them
/// tries to commit first. When the reason is another program's lock, each of them tries, and waits for the
/// lock. The kept texts take 5 MiB at most. They are lost when the process ends.
///
/// Other programs: the write lock is free between groups. When another process has the file open, the lock
/// stays free for as long as the group held it, 10 ms at most, so that the other process gets its turn. When
/// another program has the lock, the caller waits up to Settings::busyTimeout, and the caller's own queue
/// grows meanwhile. The committer does not wait for the lock, so no caller has to wait for the committer's
/// turn.
///
/// Failure: no operation throws. An operation that returns false leaves its reason for GetLastErrorMsg:
/// SQLite's text when SQLite refused, the guard's text ("not authorized: ...") when the plug-in refused. A
/// failure never deletes, replaces or creates the database file.
///
/// A file that is missing, damaged, read-only or replaced: every operation looks at the path again; within a
/// burst, every group does. So the object works again as soon as the file does, without a restart. When the
/// file loses its name, statements that are not committed go to the file that takes its place. Statements
/// that are committed belong to the old file and are not repeated in the new one, with one exception: when
/// the file is replaced during the very commit of a group, that group is repeated.
///
/// StatementGuard.h and Settings.h say what the statements may do.
class Database final : public ISqliteDatabase {
public:
    explicit Database(Settings settings = {}) : m_settings(settings) {}

    /// Call Finish first.
    ~Database() = default;

    /// Remembers `path` for all later operations, also when the file cannot be opened now. Closes another
    /// file that is open.
    bool Open(const std::string& path) override;

    /// Runs one CREATE TABLE.
    bool CreateTable(const std::string& sql) override;

    /// Runs exactly one statement that returns no rows.
    bool ExecSql(const std::string& sql) override;

    bool BatExecSql(const std::vector<std::string>& sqls) override;

    /// Runs one query that changes nothing. On failure `rows` is unchanged.
    bool QuerySql(const std::string& sql, std::vector<std::vector<std::string>>& rows) override;

    /// Runs a query, and sets `count` to the first cell of its first row. That must be an integer that fits
    /// an int. On failure `count` is unchanged.
    bool GetTotalCount(const std::string& sql, int& count) override;

    /// The text of the last failure; empty before the first failure.
    std::string GetLastErrorMsg() override;

    /// Ends the object: commits the kept statements without waiting for another process's lock, stops the
    /// committer and closes the file. An exit handler may call it on any thread, also from within an
    /// operation that crashed. It waits up to 200 ms for an operation to end. When the operation does not
    /// end, the last 10 ms of a burst may be lost. The commit and the close take as long as the disk does.
    ///
    /// Returns false when another thread may still be in an operation, or may begin one later. Then do not
    /// destroy the object. An operation that is running goes on; every operation that begins later fails.
    [[nodiscard]] bool Finish();

private:
    class Entry;

    bool RunAfterCommit(const file::LiveFile::Operation& operation);
    template <typename Action>
    bool KeepError(Action action);
    void Tell(const std::exception& error) noexcept;
    void TellNoMemory() noexcept;

    const Settings m_settings;
    std::atomic<bool> m_isFinished = false; ///< set by Finish; every operation that begins later fails
    std::mutex m_mutex; ///< guards all members below except the two thread ids; held during a whole operation
    file::LiveFile m_file{m_settings};
    group::Group m_group{m_file, m_settings.group};
    std::string m_lastError;
    std::atomic<std::thread::id> m_inside;     ///< the thread that is in an operation now, if there is one
    std::atomic<std::thread::id> m_lastInside; ///< the thread that was in an operation last
    group::Committer m_committer{m_mutex, m_group};
};

} // namespace OrvekSqlite
