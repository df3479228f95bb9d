#pragma once

#include <optional>
#include <string>
#include <utility>

#include <fcntl.h>
#include <sys/types.h>

namespace Sqlite {

/// Device and inode.
using Identity = std::pair<dev_t, ino_t>;

/// The identity of the file that `path` itself names: of a link, not of the link's target. Nothing when the
/// system cannot find or examine the file. A relative `path` begins at the open `directory`.
std::optional<Identity> IdentityOf(const std::string& path, int directory = AT_FDCWD);

/// Call this before SQLite opens the database `name` in `directory`. It checks the database file and its side
/// files, as far as they exist. Each must be a regular file with only one name, must belong to this user or
/// root, and no other user may write to it. Throws UnsafePath otherwise.
///
/// SQLite trusts these files. It plays a journal back into the database, and deletes the file that the
/// journal names. When the index shrinks while it is mapped, the process ends. In `directory`, only this user
/// and root must be able to make files (see SafeDirectory): then no other user can put a file there between
/// this check and SQLite's open.
///
/// `shown` is the path of `directory`, for the error text.
void RequireOurFiles(int directory, const std::string& name, const std::string& shown);

/// The same check for the file that `path` leads to, and for that file's directory. It follows links, because
/// SQLite follows them, and checks that no other user can have put them there or can replace them. Does
/// nothing when there is no file, or when `path` is a directory: SQLite reports both itself. Throws
/// UnsafePath.
void RequireOurFiles(const std::string& path);

/// Tells whether the log and the index of an open database still have their names.
///
/// When the log has lost its name, all later rows go into a nameless file, and are lost with it when the
/// process ends. SQLite does not hand out the descriptors of these files, so this class looks at their names.
/// That takes two system calls: call it once a commit, not once a row.
class SideFileWatch {
public:
    /// For the database at `path`, which has just been opened and read from in write-ahead mode. A relative
    /// `path` begins at the open `directory`, which must stay open for longer than this object. Such a look
    /// takes half the time of a look through SafeDirectory::PathOf, where the kernel first follows a link.
    explicit SideFileWatch(std::string path, int directory = AT_FDCWD);

    bool LogIsInPlace() { return IsInPlace(m_log, m_logIdentity); }
    /// Whether another file has the log's name now. Call this only when the log is not in place.
    bool HasOtherLog() const { return IdentityOf(m_log, m_directory).has_value(); }
    bool AreInPlace() { return LogIsInPlace() && IsInPlace(m_index, m_indexIdentity); }

private:
    /// An empty database has neither file until its first write. So a file that appears later is the
    /// connection's own.
    bool IsInPlace(const std::string& path, std::optional<Identity>& identity) const;

    int m_directory;
    std::string m_log;
    std::string m_index;
    std::optional<Identity> m_logIdentity;
    std::optional<Identity> m_indexIdentity;
};

} // namespace Sqlite
