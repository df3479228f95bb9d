#pragma once

#include <string>

/// Facts about the user and the machine. Safe from any thread and during static initialisation; none of them
/// fails.
namespace SystemTool::CommonTool {

/// The directory below which the suite keeps the user's files. It is absolute, has no trailing separator, and
/// is not created here. Linux: $XDG_DATA_HOME when that is an absolute path, else .local/share below $HOME,
/// else .local/share below the home directory of the password entry. macOS: Library/Application Support below
/// the home directory.
std::string GetUserDataDir();

/// The operating system with its version, for people. Linux: the distribution's name and the kernel's
/// release.
std::string GetOSVersionString();

} // namespace SystemTool::CommonTool
