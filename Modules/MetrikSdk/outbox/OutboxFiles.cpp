#include "Modules/MetrikSdk/outbox/OutboxFiles.h"

#include <array>
#include <cerrno>
#include <cstdio>
#include <ctime>

#include <fcntl.h>
#include <sys/stat.h>

#include "Modules/MetrikSdk/outbox/StoreError.h"
#include "Modules/Sqlite/SideFiles.h"
#include "Modules/Sqlite/Trust.h"
#include "SystemTool/Errno.h"
#include "SystemTool/IO/Descriptor.h"

namespace MetrikSdk::outbox::OutboxFiles {
namespace {

constexpr mode_t FILE_MODE = 0600;

[[noreturn]] void Fail(const std::string& what, const std::string& path, int error = errno) {
    throw StoreError(StoreFault::Reopen, what + " " + path + ": " + SystemTool::ErrnoText(error));
}

bool Exists(const Sqlite::SafeDirectory& directory, const std::string& name) {
    struct stat status {};
    return ::fstatat(directory.Number(), name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0;
}

/// Such as 20261120T101530.123Z. It sorts by time, and has no character that is special to a shell or a file
/// system.
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

void Rename(const Sqlite::SafeDirectory& directory, const std::string& from, const std::string& to) {
    if (::renameat(directory.Number(), from.c_str(), directory.Number(), to.c_str()) != 0 && errno != ENOENT)
        Fail("Cannot set aside", directory.Path() + "/" + from);
}

std::string UnusedName(const Sqlite::SafeDirectory& directory, const std::string& wanted) {
    auto name = wanted;
    for (int count = 2; Exists(directory, name); ++count)
        name = wanted + "-" + std::to_string(count);
    return name;
}

} // namespace

Sqlite::SafeDirectory OpenDirectory(const std::string& path, const std::string& home) {
    try {
        return Sqlite::SafeDirectory::Open(path, home);
    } catch (const Sqlite::UnsafePath& refusal) {
        throw StoreError(StoreFault::Unsafe, "The directory " + path + " is not used: " + refusal.what());
    } catch (const std::system_error& error) {
        throw StoreError(StoreFault::Reopen, error.what());
    }
}

Sqlite::Identity Prepare(const Sqlite::SafeDirectory& directory, const std::string& name) {
    const auto path = directory.Path() + "/" + name;
    try {
        Sqlite::RequireOurFiles(directory.Number(), name, directory.Path());
    } catch (const Sqlite::UnsafePath& refusal) {
        throw StoreError(StoreFault::Reopen, std::string("Cannot use the outbox: ") + refusal.what());
    }
    const SystemTool::IO::Descriptor file(
        ::openat(directory.Number(), name.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, FILE_MODE));
    struct stat status {};
    if (!file.IsOpen() || ::fstat(file.Number(), &status) != 0)
        Fail("Cannot open", path);
    if ((status.st_mode & 07777) != FILE_MODE && ::fchmod(file.Number(), FILE_MODE) != 0)
        Fail("Cannot make private", path);
    return {status.st_dev, status.st_ino};
}

std::string SetAside(const Sqlite::SafeDirectory& directory, const std::string& name,
                     const Sqlite::Identity& identity, WallTime now) {
    if (Sqlite::IdentityOf(directory.PathOf(name)) != identity)
        return {};
    const auto aside = UnusedName(directory, name + ".damaged-" + FileNameTime(now));
    // The database is renamed last. Otherwise another process could make a new database beside the old side
    // files, and SQLite would take them for the new database's own.
    for (const std::string suffix : Sqlite::SIDE_FILE_SUFFIXES)
        Rename(directory, name + suffix, aside + suffix);
    Rename(directory, name, aside);
    return directory.Path() + "/" + aside;
}

} // namespace MetrikSdk::outbox::OutboxFiles
