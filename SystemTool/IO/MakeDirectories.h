#pragma once

#include <string>

#include <sys/types.h>

namespace SystemTool::IO {

/// Which directory could not be made, and why. A default object means that nothing failed.
struct DirectoryFailure {
    int error = 0;    ///< An errno.
    std::string path; ///< The directory: the one that was asked for, or one of its parents.

    explicit operator bool() const { return error != 0; }
};

inline constexpr mode_t PRIVATE_DIRECTORY = 0700;

/// Makes the directory at `path` and its missing parents. After success, each directory that it made has the
/// given mode, with any umask, on a file system that has modes. A directory that existed keeps its
/// mode, because it may hold other things.
///
/// A new directory is private until it gets its mode. A symbolic link to a directory counts as a directory.
///
/// Threads: any. The umask is not changed.
DirectoryFailure MakeDirectories(const std::string& path, mode_t mode = PRIVATE_DIRECTORY,
                                 mode_t modeOfParents = PRIVATE_DIRECTORY);

} // namespace SystemTool::IO
