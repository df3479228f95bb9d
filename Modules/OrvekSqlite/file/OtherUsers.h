#pragma once

#include <string>

#include <sys/types.h>

namespace OrvekSqlite::file {

/// Tells whether another process has a database file open.
///
/// Every connection in write-ahead mode holds a read lock on the file until it is closed, also while it waits
/// for the write lock, and the system tells of such locks. A waiting connection itself cannot be seen: it
/// looks at the lock every few milliseconds and sleeps in between.
///
/// Threads: one at a time. Costs two system calls, a microsecond.
class OtherUsers {
public:
    /// For the file at `path`, which a connection of this process has just opened.
    explicit OtherUsers(const std::string& path);

    /// True also when it cannot be told: then it is better to be polite.
    bool Exist();

private:
    bool IsOurFile(int descriptor) const;
    void FindDescriptor();

    dev_t m_device = 0;
    ino_t m_inode = 0;
    int m_descriptor = -1; ///< SQLite's, borrowed; looked at anew before each use
};

} // namespace OrvekSqlite::file
