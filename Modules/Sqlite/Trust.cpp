#include "Modules/Sqlite/Trust.h"

#include <unistd.h>

namespace Sqlite {

bool IsOurs(const struct stat& status) {
    return status.st_uid == 0 || status.st_uid == ::geteuid();
}

void RequireOursAlone(const struct stat& status, const std::string& shown) {
    if (!IsOurs(status))
        throw UnsafePath(shown + " belongs to another user");
    // The sticky bit of a directory like /tmp does not help: it stops other users from removing a file, but
    // not from making one.
    if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0)
        throw UnsafePath(shown + " may be written by other users");
}

} // namespace Sqlite
