#pragma once

#include <string>

#include <sys/types.h>

namespace OrvekSqlite::file {

/// Finds out whether another process has a database file open.
///
/// Every connection in write-ahead mode holds a read lock on the file until it is closed, also while it waits
/// for the write lock. The system reports such locks. It does not report that a connection waits: a waiting
/// connection tries the lock every few milliseconds and sleeps in between.
///
/// Threads: one at a time. Takes two system calls, about a microsecond.
class OtherUsers {
public:
    /// For the file at `path`, which a connection of this process has just opened.
    explicit OtherUsers(const std::string& path);

    /// True also when this cannot be found out: it is better to leave the lock to others once too often.
    bool Exist();

private:
    bool IsOurFile(int descriptor) const;
    void FindDescriptor();

    dev_t m_device = 0;
    ino_t m_inode = 0;
    int m_descriptor = -1; ///< SQLite's descriptor, which we must not close; checked again before each use
};

} // namespace OrvekSqlite::file
