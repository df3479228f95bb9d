#include "SystemTool/IO/MakeDirectories.h"

#include <cerrno>

#include <fcntl.h>
#include <sys/stat.h>

namespace SystemTool::IO {
namespace {

/// The error of the failed mkdir, or 0 when there is a directory at `path` already.
int ErrorUnlessDirectory(const std::string& path, int error) {
    struct stat status {};
    if (::stat(path.c_str(), &status) != 0)
        return error; // why mkdir failed: why stat failed would explain nothing
    return S_ISDIR(status.st_mode) ? 0 : ENOTDIR;
}

int MakeOne(const std::string& path, mode_t mode) {
    if (::mkdir(path.c_str(), mode & PRIVATE_DIRECTORY) != 0)
        return ErrorUnlessDirectory(path, errno);
    struct stat status {};
    if (::lstat(path.c_str(), &status) == 0 && (status.st_mode & 07777) == mode)
        return 0;
    // The mode is wider than a new directory's, or the umask took rights of the owner away. fchmodat must not
    // follow a link: another user who may write into the parent could have put one there in the meantime. A
    // file system without modes refuses this, but the directory can be used all the same.
    [[maybe_unused]] const int ignored = ::fchmodat(AT_FDCWD, path.c_str(), mode, AT_SYMLINK_NOFOLLOW);
    return 0;
}

} // namespace

DirectoryFailure MakeDirectories(const std::string& path, mode_t mode, mode_t modeOfParents) {
    for (auto end = path.find('/', 1);; end = path.find('/', end + 1)) {
        const bool isLast = end == std::string::npos;
        const auto level = path.substr(0, end);
        if (const int error = MakeOne(level, isLast ? mode : modeOfParents))
            return {error, level};
        if (isLast)
            return {};
    }
}

} // namespace SystemTool::IO
