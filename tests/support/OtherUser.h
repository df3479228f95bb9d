#pragma once

#include <stdexcept>
#include <string>

#include <sys/wait.h>
#include <unistd.h>

/// A second user of the machine, for tests of attacks. Only root can act as this user.
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

/// Runs the function in a process of that user. True when the function returned true.
template <typename Function>
bool Does(Function function) {
    const pid_t child = ::fork();
    if (child == 0)
        ::_exit(::setgid(ID) == 0 && ::setuid(ID) == 0 && function() ? 0 : 1);
    int status = 0;
    return ::waitpid(child, &status, 0) == child && WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

} // namespace OtherUser
