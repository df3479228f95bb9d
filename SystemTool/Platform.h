#pragma once

#include <cstdint>
#include <optional>
#include <string>

/// The operating-system calls that differ between the systems. Each system has one implementation file
/// (Platform_linux.cpp, Platform_mac.cpp); all other code is portable. Safe from any thread, and safe during
/// static initialisation: nothing here depends on another file's static objects.
namespace SystemTool::Platform {

/// The user's data directory, absolute and without a trailing separator (unless it is the root itself). Empty
/// only when the system knows no home directory of the user. Nothing is created.
std::string UserDataDir();

/// Name and version of the operating system, as a person would write it.
std::string OSVersionString();

/// The absolute path of the running executable; empty when the system does not give it.
std::string ExecutablePath();

/// A path that opens the running executable's own file. On Linux it does so also after another file has
/// replaced it.
std::string OwnProgramFile();

/// A path that leads to the open directory itself, also after the directory was renamed. macOS has no such
/// path: there, it is the directory's present path. Empty when the system does not give it.
std::string PathThrough(int directory);

/// The id that the system's own tools show for the calling thread.
std::uint64_t CurrentThreadId();

/// The time of day in milliseconds since 1970, read without a system call. It is therefore coarse: on Linux,
/// it may be a few milliseconds old.
std::int64_t CoarseTimeMs();

/// Makes an open file at least `bytes` long and reserves disk blocks for all of it, so that a later write
/// there cannot fail because the disk is full. False when that failed; the file may then be longer than
/// before.
bool AllocateFile(int file, std::int64_t bytes);

/// Locks an open file for writing. The lock lasts until this process closes the file or ends, also by a
/// signal. Never waits. False when the lock is already held, or when the file system has no locks.
bool TryLockFile(int file);

/// Whether the file is locked through another open() of it. Takes no lock itself, so it disturbs no other
/// process.
bool IsFileLocked(int file);

/// How many datagrams the system has dropped at this socket since the socket was made, mostly because its
/// buffer was full. The count wraps around at 2^32. Nothing when the system does not give it.
std::optional<std::uint32_t> DatagramsDropped(int socket);

/// Removes the pages of program code from this process's memory. A page that the process uses again comes
/// back from the system's cache. A program that mostly waits calls this after its start, so that code that
/// only the start needed takes no memory. On a system that has no call for it, this does nothing.
void LetGoOfCode();

} // namespace SystemTool::Platform
