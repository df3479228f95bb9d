#include "Tools/reportctl/setup/Directories.h"

#include <cerrno>
#include <filesystem>
#include <system_error>

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>

#include "SystemTool/Errno.h"
#include "SystemTool/IO/Descriptor.h"
#include "SystemTool/IO/MakeDirectories.h"
#include "Tools/reportctl/setup/PidFile.h"
#include "Tools/reportctl/terminal/ShellQuoted.h"

namespace reportctl::setup {
namespace {

namespace fs = std::filesystem;

constexpr mode_t PRIVATE_MODE = 0700;
constexpr mode_t SHARED_MODE = 01777;
constexpr mode_t READABLE_MODE = 0755;

/// The state that a directory shall have.
struct Kind {
    mode_t mode;
    mode_t parentMode;
    int openFlags; ///< with O_NOFOLLOW, a symbolic link is refused
};

constexpr Kind PRIVATE{PRIVATE_MODE, PRIVATE_MODE, O_DIRECTORY | O_RDONLY | O_CLOEXEC};
constexpr Kind SHARED{SHARED_MODE, READABLE_MODE, O_DIRECTORY | O_RDONLY | O_CLOEXEC | O_NOFOLLOW};

/// Changes the mode through a descriptor, so that nothing but a directory is changed, and so that `openFlags`
/// decide whether a symbolic link is followed.
void SetMode(const std::string& path, mode_t mode, int openFlags) {
    const SystemTool::IO::Descriptor directory(::open(path.c_str(), openFlags));
    if (!directory.IsOpen() || ::fchmod(directory.Number(), mode) != 0)
        SystemTool::ThrowErrno(errno);
}

/// Makes the directory private at first, and then gives it its mode. Another program may have made it
/// meanwhile: then it gets its mode, too, and AlreadyThere is thrown.
void Make(const std::string& path, const Kind& kind) {
    const fs::path itself = (fs::path(path) / "").parent_path(); // without a slash at its end
    if (const auto parent = itself.parent_path(); !parent.empty())
        if (const auto failure =
                SystemTool::IO::MakeDirectories(parent.string(), kind.parentMode, kind.parentMode))
            SystemTool::ThrowErrno(failure.error);
    const int refusal = ::mkdir(itself.c_str(), PRIVATE_MODE) == 0 ? 0 : errno;
    if (refusal != 0 && refusal != EEXIST)
        SystemTool::ThrowErrno(refusal);
    SetMode(path, kind.mode, kind.openFlags);
    if (refusal == EEXIST)
        throw terminal::AlreadyThere();
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
