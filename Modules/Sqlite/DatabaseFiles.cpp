#include "Modules/Sqlite/DatabaseFiles.h"

#include <cerrno>
#include <filesystem>

#include <fcntl.h>
#include <sys/stat.h>

#include "Modules/Sqlite/Links.h"
#include "Modules/Sqlite/SafeDirectory.h"
#include "Modules/Sqlite/SideFiles.h"
#include "Modules/Sqlite/Trust.h"

namespace Sqlite {
namespace {

void RequireOurFile(int directory, const std::string& name, const std::string& shown) {
    struct stat status {};
    if (::fstatat(directory, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) {
        if (errno == ENOENT)
            return;
        throw UnsafePath(shown + " cannot be looked at");
    }
    if (status.st_nlink == 0) // another process deleted it during the call, as SQLite does at its last close
        return;
    if (!S_ISREG(status.st_mode))
        throw UnsafePath(shown + " is not a regular file");
    // A write to this file would change it under its other name, too, which may be anywhere.
    if (status.st_nlink > 1)
        throw UnsafePath(shown + " has more than one name");
    RequireOursAlone(status, shown);
}

} // namespace

std::optional<Identity> IdentityOf(const std::string& path, int directory) {
    struct stat status {};
    if (::fstatat(directory, path.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0)
        return std::nullopt;
    return Identity{status.st_dev, status.st_ino};
}

void RequireOurFiles(int directory, const std::string& name, const std::string& shown) {
    const std::string path = std::filesystem::path(shown) / name;
    RequireOurFile(directory, name, path);
    for (const std::string suffix : SIDE_FILE_SUFFIXES)
        RequireOurFile(directory, name + suffix, path + suffix);
}

void RequireOurFiles(const std::string& path) {
    RequireOurLinks(path);
    std::error_code error;
    const auto file = std::filesystem::canonical(path, error);
    if (error || std::filesystem::is_directory(file, error))
        return;
    const auto shown = file.parent_path().string();
    const SystemTool::IO::Descriptor directory(::open(shown.c_str(), SafeDirectory::LOOK_FLAGS));
    struct stat status {};
    if (!directory.IsOpen() || ::fstat(directory.Number(), &status) != 0)
        return;
    RequireOursAlone(status, shown);
    RequireOurFiles(directory.Number(), file.filename().string(), shown);
}

bool SideFileWatch::IsInPlace(const std::string& path, std::optional<Identity>& identity) const {
    const auto now = IdentityOf(path, m_directory);
    if (!identity)
        identity = now;
    return now == identity;
}

SideFileWatch::SideFileWatch(std::string path, int directory)
    : m_directory(directory), m_log(path + "-wal"), m_index(std::move(path) + "-shm"),
      m_logIdentity(IdentityOf(m_log, directory)), m_indexIdentity(IdentityOf(m_index, directory)) {}

} // namespace Sqlite
