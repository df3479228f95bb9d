#pragma once

#include <algorithm>
#include <stdexcept>
#include <string>
#include <vector>

#include <unistd.h>

#include "tests/support/ChildProcess.h"

/// A second, ordinary user of the machine, for tests of attacks and of rights. Only root can act as this
/// user.
namespace OtherUser {

inline constexpr uid_t ID = 65534;

inline bool CanBeMade() {
    return ::geteuid() == 0;
}

/// Makes the other user the owner of the file; of a link itself, not of its target.
inline void Give(const std::string& path) {
    if (::lchown(path.c_str(), ID, ID) != 0)
        throw std::runtime_error("cannot give away " + path);
}

/// Makes this process that user's. Only in a child process, because a process cannot become root again.
inline bool Become() {
    return ::setgid(ID) == 0 && ::setuid(ID) == 0;
}

/// Makes this process an ordinary user's, and gives that user `directory` and the `files` in it. A test about
/// rights needs it, because root may do everything. Only in a child process. True when the process belongs to
/// an ordinary user, as it does from the start where the test does not run as root.
inline bool BecomeOwnerOf(const std::string& directory, std::vector<std::string> files = {}) {
    if (!CanBeMade())
        return true;
    files.push_back(directory);
    std::ranges::for_each(files, Give);
    return Become();
}

/// Runs the function in a process of that user. True when the function returned true.
template <typename Function>
bool Does(Function function) {
    return ChildProcess([&] { return Become() && function(); }).Wait() == 0;
}

} // namespace OtherUser
