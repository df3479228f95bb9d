#include "Modules/MetrikSdk/outbox/OutboxFiles.h"

#include <array>
#include <cerrno>
#include <cstdio>
#include <ctime>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Modules/MetrikSdk/outbox/StoreError.h"

namespace MetrikSdk::outbox::OutboxFiles {
namespace {

constexpr mode_t DIRECTORY_MODE = 0700;
constexpr mode_t FILE_MODE = 0600;

[[noreturn]] void Fail(const std::string& what, const std::string& path, int error = errno) {
    const auto reason = std::generic_category().message(error);
    throw StoreError(StoreFault::Reopen, what + " " + path + ": " + reason);
}

class Descriptor {
public:
    explicit Descriptor(int number) : m_number(number) {}
    ~Descriptor() {
        if (m_number >= 0)
            ::close(m_number);
    }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    int Number() const { return m_number; }

private:
    int m_number;
};

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

std::string UnusedName(const std::string& wanted) {
    auto name = wanted;
    for (int count = 2; Exists(name); ++count)
        name = wanted + "-" + std::to_string(count);
    return name;
}

} // namespace

void MakeDirectory(const std::string& directory) {
    for (auto end = directory.find('/', 1);; end = directory.find('/', end + 1)) {
        const auto level = directory.substr(0, end);
        // The umask can only take rights away from a mode given to mkdir.
        const int error = ::mkdir(level.c_str(), DIRECTORY_MODE) == 0 ? 0 : errno;
        if (error != 0 && error != EEXIST && !Exists(level)) // which has an errno of its own
            Fail("Cannot make the directory", level, error);
        if (end == std::string::npos)
            return;
    }
}

Identity Prepare(const std::string& path) {
    const Descriptor file(::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, FILE_MODE));
    struct stat status {};
    if (file.Number() < 0 || ::fstat(file.Number(), &status) != 0)
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
    for (const std::string suffix : {"-wal", "-shm", ""})
        if (::rename((path + suffix).c_str(), (name + suffix).c_str()) != 0 && errno != ENOENT)
            Fail("Cannot set aside", path + suffix);
    return name;
}

} // namespace MetrikSdk::outbox::OutboxFiles
