#include "SystemTool/Platform.h"

#include <array>
#include <cstdlib>
#include <ctime>
#include <fstream>

#include <fcntl.h>
#include <link.h>
#include <linux/sock_diag.h>
#include <pwd.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/utsname.h>
#include <unistd.h>

namespace SystemTool::Platform {
namespace {

constexpr std::size_t PASSWORD_ENTRY_BYTES = 16384; // more than glibc suggests by _SC_GETPW_R_SIZE_MAX

std::string HomeOfPasswordEntry() {
    passwd entry{};
    passwd* found = nullptr;
    std::array<char, PASSWORD_ENTRY_BYTES> buffer{};
    if (::getpwuid_r(::getuid(), &entry, buffer.data(), buffer.size(), &found) != 0 || found == nullptr)
        return {};
    return found->pw_dir;
}

std::string WithoutTrailingSeparators(std::string path) {
    while (path.size() > 1 && path.back() == '/')
        path.pop_back();
    return path;
}

/// The absolute path in an environment variable. Empty when the variable is not set, is empty or holds a
/// relative path: the desktop's base directory rules tell programs to ignore such values.
std::string AbsolutePathFromEnvironment(const char* name) {
    const char* value = std::getenv(name); // NOLINT(concurrency-mt-unsafe): no thread sets any
    return value != nullptr && value[0] == '/' ? value : "";
}

/// Undoes the shell quoting of a value of os-release: quotes around it, a backslash before a special
/// character.
std::string Unquoted(const std::string& value) {
    std::string text;
    for (std::size_t i = 0; i < value.size(); ++i) {
        if (value[i] == '\\' && i + 1 < value.size())
            text += value[++i];
        else if (value[i] != '"' && value[i] != '\'')
            text += value[i];
    }
    return text;
}

std::string PrettyNameOf(const char* osReleasePath) {
    static constexpr std::string_view KEY = "PRETTY_NAME=";
    std::ifstream file(osReleasePath);
    for (std::string line; std::getline(file, line);)
        if (line.compare(0, KEY.size(), KEY) == 0)
            return Unquoted(line.substr(KEY.size()));
    return {};
}

/// This lock belongs to the open file and not to the process: it stays when the process closes another
/// descriptor of the same file.
int ControlLock(int file, int command, struct flock& lock) {
    lock.l_type = F_WRLCK;
    lock.l_whence = SEEK_SET; // with start and length 0: the whole file
    return ::fcntl(file, command, &lock);
}

} // namespace

std::string UserDataDir() {
    if (auto data = AbsolutePathFromEnvironment("XDG_DATA_HOME"); !data.empty())
        return WithoutTrailingSeparators(std::move(data));
    auto home = AbsolutePathFromEnvironment("HOME");
    if (home.empty())
        home = HomeOfPasswordEntry();
    if (home.empty())
        return {};
    home = WithoutTrailingSeparators(std::move(home));
    return (home == "/" ? "" : home) + "/.local/share";
}

std::string OSVersionString() {
    auto name = PrettyNameOf("/etc/os-release");
    if (name.empty())
        name = PrettyNameOf("/usr/lib/os-release");
    utsname kernel{};
    if (::uname(&kernel) != 0)
        return name.empty() ? "Linux" : name;
    return (name.empty() ? kernel.sysname : name) + " " + kernel.release;
}

std::string ExecutablePath() {
    std::string path(256, '\0');
    for (;;) {
        const auto length = ::readlink("/proc/self/exe", path.data(), path.size());
        if (length < 0)
            return {};
        if (static_cast<std::size_t>(length) < path.size()) {
            path.resize(static_cast<std::size_t>(length));
            return path;
        }
        path.resize(path.size() * 2); // a full buffer may be a cut path
    }
}

std::string OwnProgramFile() {
    return "/proc/self/exe";
}

std::string PathThrough(int directory) {
    return "/proc/self/fd/" + std::to_string(directory);
}

std::uint64_t CurrentThreadId() {
    return static_cast<std::uint64_t>(::syscall(SYS_gettid));
}

std::int64_t CoarseTimeMs() {
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME_COARSE, &now);
    return std::int64_t{now.tv_sec} * 1000 + now.tv_nsec / 1'000'000;
}

bool AllocateFile(int file, std::int64_t bytes) {
    return ::posix_fallocate(file, 0, bytes) == 0;
}

bool TryLockFile(int file) {
    struct flock lock {};
    return ControlLock(file, F_OFD_SETLK, lock) == 0;
}

bool IsFileLocked(int file) {
    struct flock lock {};
    return ControlLock(file, F_OFD_GETLK, lock) == 0 && lock.l_type != F_UNLCK;
}

std::optional<std::uint32_t> DatagramsDropped(int socket) {
    std::array<std::uint32_t, SK_MEMINFO_VARS> figures{};
    socklen_t size = sizeof figures;
    if (::getsockopt(socket, SOL_SOCKET, SO_MEMINFO, figures.data(), &size) != 0 || size != sizeof figures)
        return std::nullopt;
    return figures[SK_MEMINFO_DROPS];
}

/// Only segments that cannot be written to. Their pages are the same as in the file, so the system can read
/// them again.
void LetGoOfCode() {
    const auto letGo = [](dl_phdr_info* library, std::size_t, void*) {
        const auto page = static_cast<ElfW(Addr)>(::sysconf(_SC_PAGESIZE));
        for (int i = 0; i < library->dlpi_phnum; ++i) {
            const auto& segment = library->dlpi_phdr[i];
            if (segment.p_type != PT_LOAD || (segment.p_flags & (PF_X | PF_W)) != PF_X)
                continue;
            const ElfW(Addr) begin = (library->dlpi_addr + segment.p_vaddr) / page * page;
            const ElfW(Addr) end = library->dlpi_addr + segment.p_vaddr + segment.p_memsz;
            // NOLINTNEXTLINE(performance-no-int-to-ptr): the system tells addresses as numbers
            static_cast<void>(::madvise(reinterpret_cast<void*>(begin), end - begin, MADV_DONTNEED));
        }
        return 0;
    };
    ::dl_iterate_phdr(letGo, nullptr);
}

} // namespace SystemTool::Platform
