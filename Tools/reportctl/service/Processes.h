#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include <sys/types.h>

/// What the system tells of processes. It tells more of this user's own processes than of others'; root sees
/// all of them. Nothing throws. Linux; elsewhere nothing is known.
namespace reportctl::service {

/// The user's name, or its number where it has none.
std::string NameOf(uid_t user);

/// The name of a process's program, as the system shows it to everybody, but not cut to 15 characters where
/// that can be seen.
std::optional<std::string> ProgramNameOf(pid_t process);

std::optional<uid_t> OwnerOf(pid_t process);

/// A variable of the environment that the process was started with.
std::optional<std::string> EnvironmentOf(pid_t process, const std::string& name);

/// Whether it has a library of this file name loaded; nothing when that cannot be seen.
std::optional<bool> HasLoaded(pid_t process, const std::string& library);

/// Whether it has this socket open; nothing when that cannot be seen.
std::optional<bool> HasSocket(pid_t process, std::uint64_t inode);

/// The process that has it, if it can be seen.
std::optional<pid_t> ProcessOfSocket(std::uint64_t inode);

struct BoundSocket {
    uid_t owner = 0;
    std::uint64_t inode = 0;
};

/// The sockets that are bound to the service's address and port, or to the port at any address; the exact
/// ones first.
std::vector<BoundSocket> SocketsAtTheServicesPort();

/// The process that holds the machine's lock of the one service; nothing when none does.
std::optional<pid_t> LockHolder();

} // namespace reportctl::service
