#include "Tools/reportctl/setup/Directories.h"

#include <cerrno>
#include <filesystem>
#include <stdexcept>
#include <system_error>

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Tools/reportctl/setup/PidFile.h"
#include "Tools/reportctl/terminal/ShellQuoted.h"

namespace reportctl::setup {
namespace {

namespace fs = std::filesystem;

constexpr mode_t PRIVATE_MODE = 0700;
constexpr mode_t SHARED_MODE = 01777;
constexpr mode_t READABLE_MODE = 0755;

/// What a directory is to be like.
struct Kind {
    mode_t mode;
    mode_t parentMode;
    int openFlags; ///< decides about symbolic links
};

constexpr Kind PRIVATE{PRIVATE_MODE, PRIVATE_MODE, O_DIRECTORY | O_RDONLY | O_CLOEXEC};
constexpr Kind SHARED{SHARED_MODE, READABLE_MODE, O_DIRECTORY | O_RDONLY | O_CLOEXEC | O_NOFOLLOW};

[[noreturn]] void ThrowErrno(int code) {
    throw std::runtime_error(std::generic_category().message(code));
}

/// Through a descriptor, so that what is changed is the directory that was made or looked at.
void SetMode(const std::string& path, mode_t mode, int openFlags) {
    const int directory = ::open(path.c_str(), openFlags);
    if (directory < 0)
        ThrowErrno(errno);
    const int code = ::fchmod(directory, mode) == 0 ? 0 : errno;
    ::close(directory);
    if (code != 0)
        ThrowErrno(code);
}

/// Private at first, then opened as wide as it is to be. One that appeared meanwhile is as good.
void MakeOne(const std::string& path, mode_t mode, int openFlags) {
    if (::mkdir(path.c_str(), PRIVATE_MODE) != 0 && errno != EEXIST)
        ThrowErrno(errno);
    SetMode(path, mode, openFlags);
}

void Make(const fs::path& path, const Kind& kind) {
    fs::path parents;
    for (const auto& name : path.parent_path()) {
        parents /= name;
        if (!fs::exists(parents))
            MakeOne(parents.string(), kind.parentMode, kind.openFlags);
    }
    MakeOne(path.string(), kind.mode, kind.openFlags);
}

bool Ensure(terminal::Worklog& log, const std::string& path, const Kind& kind, const std::string& makeAdvice,
            const std::string& changeAdvice) {
    const auto thing = fmt::format("directory {} (mode {:04o})", path, kind.mode);
    std::error_code error;
    const bool mayBeLink = (kind.openFlags & O_NOFOLLOW) == 0;
    const auto status = mayBeLink ? fs::status(path, error) : fs::symlink_status(path, error);
    if (status.type() == fs::file_type::not_found)
        return log.Run(
            terminal::MAKE, thing, [&] { Make(path, kind); }, makeAdvice);
    if (status.type() == fs::file_type::none) {
        log.Fail(fmt::format("Cannot look at {}: {}.", path, error.message()));
        return false;
    }
    if (!fs::is_directory(status)) {
        log.Fail(fmt::format("{} is not a directory. Move it away and run this again.", path));
        return false;
    }
    if (static_cast<mode_t>(status.permissions()) != kind.mode)
        return log.Run(
            terminal::CHANGE, thing, [&] { SetMode(path, kind.mode, kind.openFlags); }, changeAdvice);
    log.AlreadyDone(thing);
    return true;
}

} // namespace

void EnsurePrivateDirectory(terminal::Worklog& log, const std::string& path) {
    Ensure(log, path, PRIVATE, "Give this user the right to write there and run this again.",
           fmt::format("Run: sudo chown \"$(id -u)\" {}, then this again.", terminal::ShellQuoted(path)));
}

bool EnsureSharedDirectory(terminal::Worklog& log, const std::string& path) {
    return Ensure(log, path, SHARED,
                  fmt::format("Run: sudo install -d -m 1777 {} && {}", terminal::ShellQuoted(path),
                              CommandForPidFile(path)),
                  fmt::format("Run: sudo chmod 1777 {}", terminal::ShellQuoted(path)));
}

} // namespace reportctl::setup
