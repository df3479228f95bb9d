#pragma once

#include <stdexcept>
#include <string>

#include <sys/stat.h>

namespace Sqlite {

/// Another user could change what a path leads to, or it leads to nothing that can be used. The text names
/// the place and the reason.
class UnsafePath : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Whether the owner is this process's user or root, who can do as they like with this process anyhow.
bool IsOurs(const struct stat& status);

/// Throws UnsafePath when another user could change the file or directory `shown`: by being its owner, or by
/// a right to write. An access control list shows in the group's bits, so it counts as a right of others,
/// too.
void RequireOursAlone(const struct stat& status, const std::string& shown);

} // namespace Sqlite
