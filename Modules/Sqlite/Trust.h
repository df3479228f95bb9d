#pragma once

#include <stdexcept>
#include <string>

#include <sys/stat.h>

namespace Sqlite {

/// Thrown when another user could change what a path leads to, or when the path leads to nothing that can be
/// used. The text names the place and the reason.
class UnsafePath : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Whether the owner is this process's user or root. These two can do anything with this process anyway.
bool IsOurs(const struct stat& status);

/// Throws UnsafePath when another user could change the file or directory `shown`, as its owner or by a right
/// to write. The rights of an access control list appear in the group's bits, so a right of the group to
/// write counts as a right of other users.
void RequireOursAlone(const struct stat& status, const std::string& shown);

} // namespace Sqlite
