#pragma once

#include <cstdint>
#include <string>

/// The operating-system calls that differ between the systems, one implementation file per system (Platform_linux.cpp,
/// Platform_mac.cpp); everything else is portable. Safe from any thread, and safe during static
/// initialisation: nothing here depends on another file's static objects.
namespace SystemTool::Platform {

/// The user's data directory, absolute and without a trailing separator (unless it is the root itself). Empty only for a user whom the
/// system gives no home directory at all. Nothing is created.
std::string UserDataDir();

/// Name and version of the operating system, as a person would write it.
std::string OSVersionString();

/// Absolute path of the running executable; empty when the system does not tell.
std::string ExecutablePath();

/// A path that opens the running executable's file, on Linux also when another file has taken its place.
std::string OwnProgramFile();

/// A path that leads to the open directory itself, wherever it is renamed to. (macOS has none that leads through a
/// descriptor: there it is the directory's path at this moment.) Empty when the system does not tell.
std::string PathThrough(int directory);

/// The id that the system's own tools show for the calling thread.
std::uint64_t CurrentThreadId();

} // namespace SystemTool::Platform
