#pragma once

#include <string>

#include <sys/types.h>

namespace SystemTool::IO {

/// Which directory could not be made, and why. Default: nothing failed.
struct DirectoryFailure {
    int error = 0;    ///< An errno.
    std::string path; ///< The directory: the one that was asked for, or one of its parents.

    explicit operator bool() const { return error != 0; }
};

inline constexpr mode_t PRIVATE_DIRECTORY = 0700;

/// Makes the directory at `path` and its missing parents. When this returns without a failure, each directory
/// that it made has its mode, under any umask, on a file system that knows modes. A directory that exists
/// keeps its mode: it may hold other things.
///
/// A new directory is private until it has its mode. A symbolic link to a directory counts as a directory.
/// Threads: any. The umask is not changed.
DirectoryFailure MakeDirectories(const std::string& path, mode_t mode = PRIVATE_DIRECTORY,
                                 mode_t modeOfParents = PRIVATE_DIRECTORY);

} // namespace SystemTool::IO
