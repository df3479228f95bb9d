#include "Modules/OrvekSqlite/file/OtherUsers.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace OrvekSqlite::file {
namespace {

/// The search for a descriptor ends at this number. A new descriptor gets the lowest free number, and the
/// service has some twenty.
constexpr int MAX_DESCRIPTOR = 1024;

/// The bytes that SQLite locks in a database file. SQLite documents them; they come after the first gigabyte.
constexpr off_t SHARED_FIRST = 0x40000000 + 2;
constexpr off_t SHARED_BYTES = 510;

} // namespace

OtherUsers::OtherUsers(const std::string& path) {
    struct stat file {};
    if (::stat(path.c_str(), &file) != 0)
        return;
    m_device = file.st_dev;
    m_inode = file.st_ino;
    FindDescriptor();
}

bool OtherUsers::Exist() {
    if (!IsOurFile(m_descriptor))
        FindDescriptor();
    struct flock lock {};
    lock.l_type = F_WRLCK;
    lock.l_whence = SEEK_SET;
    lock.l_start = SHARED_FIRST;
    lock.l_len = SHARED_BYTES;
    // This only asks who holds the lock, and does not take it. Locks of this process are left out of the
    // answer.
    return ::fcntl(m_descriptor, F_GETLK, &lock) != 0 || lock.l_type != F_UNLCK;
}

bool OtherUsers::IsOurFile(int descriptor) const {
    struct stat file {};
    return ::fstat(descriptor, &file) == 0 && file.st_dev == m_device && file.st_ino == m_inode;
}

/// Finds SQLite's own descriptor of the file, which SQLite does not hand out. We must not open one of our
/// own: closing any descriptor of a file drops all locks of the process on that file, SQLite's among them.
void OtherUsers::FindDescriptor() {
    m_descriptor = -1;
    for (int descriptor = 0; descriptor < MAX_DESCRIPTOR && m_descriptor < 0; ++descriptor)
        if (IsOurFile(descriptor))
            m_descriptor = descriptor;
}

} // namespace OrvekSqlite::file
