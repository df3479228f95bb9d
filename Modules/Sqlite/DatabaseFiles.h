#pragma once

#include <optional>
#include <string>
#include <utility>

#include <sys/types.h>

namespace Sqlite {

/// Device and inode.
using Identity = std::pair<dev_t, ino_t>;

/// Of the file that the path itself names, a link included; nothing when there is none.
std::optional<Identity> IdentityOf(const std::string& path);

/// To be called before SQLite opens the database `name` in `directory`. Throws UnsafePath unless each of its
/// files that exists is a regular file with one name, belongs to this user or root, and can be written by no
/// other user.
///
/// SQLite trusts what lies there: it plays a journal back into the database and deletes the file that the
/// journal names, and a log or an index that shrinks while it is mapped ends the process. `directory` must be
/// one in which only this user and root can make files (see SafeDirectory); then nothing can be put there
/// between this check and SQLite's open.
///
/// `shown` is the directory's path, for the text.
void RequireOurFiles(int directory, const std::string& name, const std::string& shown);

/// The same for the file that `path` leads to, and for its directory. Links are followed, as SQLite follows
/// them. Does nothing when there is no file, or a directory: SQLite says so itself. Throws UnsafePath.
void RequireOurFiles(const std::string& path);

/// Whether the log and the index of an open database still have their names.
///
/// A log without a name takes every row that follows, and takes them along when the process ends. The files
/// belong to the connection that opened them, so they are looked at by name: two system calls, to be made
/// once a commit and not once a row.
class SideFileWatch {
public:
    /// For the database at `path`, which has just been opened and read from in write-ahead mode.
    explicit SideFileWatch(std::string path);

    bool LogIsInPlace() { return IsInPlace(m_log, m_logIdentity); }
    /// When the log is not in place: whether another file has its name.
    bool HasOtherLog() const { return IdentityOf(m_log).has_value(); }
    bool AreInPlace() { return LogIsInPlace() && IsInPlace(m_index, m_indexIdentity); }

private:
    /// An empty database has neither file until its first write: one that appears is the connection's own.
    static bool IsInPlace(const std::string& path, std::optional<Identity>& identity);

    std::string m_log;
    std::string m_index;
    std::optional<Identity> m_logIdentity;
    std::optional<Identity> m_indexIdentity;
};

} // namespace Sqlite
