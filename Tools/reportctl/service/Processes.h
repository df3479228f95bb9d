#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include <sys/types.h>

/// Looks up processes in the system's /proc. The system shows more of this user's own processes than of other
/// users'; root sees all of them. Nothing throws. On a system other than Linux, nothing is found.
namespace reportctl::service {

/// The user's name, or its number where it has none.
std::string NameOf(uid_t user);

/// The file name of a process's program. When this user may not see the program's path, it is the name that
/// the system shows to every user, cut to 15 characters. Nothing when there is no such process.
std::optional<std::string> ProgramNameOf(pid_t process);

std::optional<uid_t> OwnerOf(pid_t process);

/// A variable of the environment that the process was started with.
std::optional<std::string> EnvironmentOf(pid_t process, const std::string& name);

/// Whether the process has loaded a library with this file name; nothing when this user may not see it.
std::optional<bool> HasLoaded(pid_t process, const std::string& library);

/// Whether the process has this socket open; nothing when this user may not see it.
std::optional<bool> HasSocket(pid_t process, std::uint64_t inode);

/// The process that has this socket open; nothing when this user may not see it.
std::optional<pid_t> ProcessOfSocket(std::uint64_t inode);

struct BoundSocket {
    uid_t owner = 0;
    std::uint64_t inode = 0;
    bool isAtTheServicesAddress = false; ///< False: it is bound to all addresses of the machine.
    std::uint64_t unreadBytes = 0;       ///< What the kernel keeps until the program reads it.
    std::uint32_t dropped = 0;           ///< Datagrams that the kernel has dropped at this socket.
};

/// The sockets that are bound to the service's port. Those at the service's own address come first, then
/// those at any address.
std::vector<BoundSocket> SocketsAtTheServicesPort();

} // namespace reportctl::service
