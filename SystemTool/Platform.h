#pragma once

#include <cstdint>
#include <optional>
#include <string>

/// The operating-system calls that differ between the systems, one implementation file per system
/// (Platform_linux.cpp, Platform_mac.cpp); everything else is portable. Safe from any thread, and safe during
/// static initialisation: nothing here depends on another file's static objects.
namespace SystemTool::Platform {

/// The user's data directory, absolute and without a trailing separator (unless it is the root itself). Empty
/// only for a user whom the system gives no home directory at all. Nothing is created.
std::string UserDataDir();

/// Name and version of the operating system, as a person would write it.
std::string OSVersionString();

/// Absolute path of the running executable; empty when the system does not tell.
std::string ExecutablePath();

/// A path that opens the running executable's file, on Linux also when another file has taken its place.
std::string OwnProgramFile();

/// A path that leads to the open directory itself, wherever it is renamed to. (macOS has none that leads
/// through a descriptor: there it is the directory's path at this moment.) Empty when the system does not
/// tell.
std::string PathThrough(int directory);

/// The id that the system's own tools show for the calling thread.
std::uint64_t CurrentThreadId();

/// The time of day in milliseconds since 1970, as fine as the system tells it without a system call: on Linux
/// a few milliseconds old at the most.
std::int64_t CoarseTimeMs();

/// Gives an open file at least this size, and blocks of its own for all of it: nothing that is written there
/// later can fail for want of room. False when that cannot be had; the file may then be longer than it was.
bool AllocateFile(int file, std::int64_t bytes);

/// Locks an open file for writing, for as long as it is open in this process and however that ends. Never
/// waits. False when another one holds the lock, or the file system has no locks.
bool TryLockFile(int file);

/// Whether another opening of the file holds its lock. Takes no lock itself, so it disturbs no other process.
bool IsFileLocked(int file);

/// How many datagrams the system has dropped at this socket since it was made, most of them for want of room;
/// counts modulo 2^32. Nothing when the system does not tell.
std::optional<std::uint32_t> DatagramsDropped(int socket);

} // namespace SystemTool::Platform
