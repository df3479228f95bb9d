#include "SystemTool/Platform.h"

#include <array>
#include <climits>
#include <cstdlib>
#include <ctime>

#include <fcntl.h>
#include <mach-o/dyld.h>
#include <pthread.h>
#include <pwd.h>
#include <sys/stat.h>
#include <sys/sysctl.h>
#include <unistd.h>

// Written for the product's home system; the project's own tests run on Linux only.
namespace SystemTool::Platform {

std::string UserDataDir() {
    std::string home;
    if (const char* value = std::getenv("HOME"); value != nullptr && value[0] == '/')
        home = value;
    else if (const passwd* entry = ::getpwuid(::getuid()); entry != nullptr)
        home = entry->pw_dir;
    while (!home.empty() && home.back() == '/')
        home.pop_back();
    return home.empty() ? "" : home + "/Library/Application Support";
}

std::string OSVersionString() {
    std::array<char, 64> version{};
    std::size_t size = version.size();
    if (::sysctlbyname("kern.osproductversion", version.data(), &size, nullptr, 0) != 0)
        return "macOS";
    return std::string("macOS ") + version.data();
}

std::string ExecutablePath() {
    std::uint32_t size = 0;
    ::_NSGetExecutablePath(nullptr, &size); // fails, and sets `size`
    std::string path(size, '\0');
    if (::_NSGetExecutablePath(path.data(), &size) != 0)
        return {};
    std::array<char, PATH_MAX> resolved{};
    return ::realpath(path.c_str(), resolved.data()) != nullptr ? resolved.data() : path.c_str();
}

std::string OwnProgramFile() {
    return ExecutablePath();
}

std::string PathThrough(int directory) {
    std::array<char, PATH_MAX> path{};
    return ::fcntl(directory, F_GETPATH, path.data()) == 0 ? path.data() : "";
}

std::uint64_t CurrentThreadId() {
    std::uint64_t id = 0;
    ::pthread_threadid_np(nullptr, &id);
    return id;
}

std::int64_t CoarseTimeMs() {
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now); // no system call either
    return std::int64_t{now.tv_sec} * 1000 + now.tv_nsec / 1'000'000;
}

bool AllocateFile(int file, std::int64_t bytes) {
    struct stat status {};
    if (::fstat(file, &status) != 0)
        return false;
    if (status.st_size >= bytes)
        return true;
    fstore_t store{F_ALLOCATEALL, F_PEOFPOSMODE, 0, bytes - status.st_size, 0};
    return ::fcntl(file, F_PREALLOCATE, &store) == 0 && ::ftruncate(file, bytes) == 0;
}

// The lock belongs to the process, because this system has no lock that belongs to one open file. Nothing
// else in the process opens and closes the file.
bool TryLockFile(int file) {
    struct flock lock {};
    lock.l_type = F_WRLCK;
    lock.l_whence = SEEK_SET;
    return ::fcntl(file, F_SETLK, &lock) == 0;
}

bool IsFileLocked(int file) {
    struct flock lock {};
    lock.l_type = F_WRLCK;
    lock.l_whence = SEEK_SET;
    return ::fcntl(file, F_GETLK, &lock) == 0 && lock.l_type != F_UNLCK;
}

std::optional<std::uint32_t> DatagramsDropped(int) {
    return std::nullopt;
}

void LetGoOfCode() {} // macOS itself compresses and drops unused pages

} // namespace SystemTool::Platform
