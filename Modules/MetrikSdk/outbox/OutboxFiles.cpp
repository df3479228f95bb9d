#include "Modules/MetrikSdk/outbox/OutboxFiles.h"

#include <array>
#include <cerrno>
#include <cstdio>
#include <ctime>

#include <fcntl.h>
#include <sys/stat.h>

#include "Modules/MetrikSdk/outbox/StoreError.h"
#include "Modules/Sqlite/SideFiles.h"
#include "SystemTool/Errno.h"
#include "SystemTool/IO/Descriptor.h"
#include "SystemTool/IO/MakeDirectories.h"

namespace MetrikSdk::outbox::OutboxFiles {
namespace {

constexpr mode_t FILE_MODE = 0600;

[[noreturn]] void Fail(const std::string& what, const std::string& path, int error = errno) {
    throw StoreError(StoreFault::Reopen, what + " " + path + ": " + SystemTool::ErrnoText(error));
}

bool Exists(const std::string& path) {
    struct stat status {};
    return ::lstat(path.c_str(), &status) == 0;
}

/// Such as 20261120T101530.123Z: sorts by time, and no character that a shell or a file system minds.
std::string FileNameTime(WallTime now) {
    const auto milliseconds = now.time_since_epoch().count();
    const std::time_t seconds = static_cast<std::time_t>(milliseconds / 1000);
    std::tm utc{};
    ::gmtime_r(&seconds, &utc);
    std::array<char, 32> date{};
    std::array<char, 48> text{};
    std::strftime(date.data(), date.size(), "%Y%m%dT%H%M%S", &utc);
    std::snprintf(text.data(), text.size(), "%s.%03dZ", date.data(), static_cast<int>(milliseconds % 1000));
    return text.data();
}

void Rename(const std::string& from, const std::string& to) {
    if (::rename(from.c_str(), to.c_str()) != 0 && errno != ENOENT)
        Fail("Cannot set aside", from);
}

std::string UnusedName(const std::string& wanted) {
    auto name = wanted;
    for (int count = 2; Exists(name); ++count)
        name = wanted + "-" + std::to_string(count);
    return name;
}

} // namespace

void MakeDirectory(const std::string& directory) {
    if (const auto failure = SystemTool::IO::MakeDirectories(directory))
        Fail("Cannot make the directory", failure.path, failure.error);
}

Identity Prepare(const std::string& path) {
    const SystemTool::IO::Descriptor file(
        ::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, FILE_MODE));
    struct stat status {};
    if (!file.IsOpen() || ::fstat(file.Number(), &status) != 0)
        Fail("Cannot open", path);
    if (!S_ISREG(status.st_mode))
        throw StoreError(StoreFault::Reopen, "Not a regular file: " + path);
    if ((status.st_mode & 07777) != FILE_MODE && ::fchmod(file.Number(), FILE_MODE) != 0)
        Fail("Cannot make private", path);
    return {status.st_dev, status.st_ino};
}

std::optional<Identity> IdentityOf(const std::string& path) {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0)
        return std::nullopt;
    return Identity{status.st_dev, status.st_ino};
}

std::string SetAside(const std::string& path, const Identity& identity, WallTime now) {
    if (IdentityOf(path) != identity)
        return {};
    auto name = UnusedName(path + ".damaged-" + FileNameTime(now));
    // The database goes last: a new one beside the side files of an old one would take them for its own.
    for (const auto* suffix : Sqlite::SIDE_FILE_SUFFIXES)
        Rename(path + suffix, name + suffix);
    Rename(path, name);
    return name;
}

} // namespace MetrikSdk::outbox::OutboxFiles
