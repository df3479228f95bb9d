#pragma once

#include <string>

#include <fcntl.h>

#include "SystemTool/IO/Descriptor.h"

namespace Sqlite {

/// A directory in which only this user and root can make, swap or remove files, held open.
///
/// The rule. Below the user's data directory (`home`), each component belongs to this user or root and can be
/// written by no other user; what is missing is made, 0700. Anywhere else this holds for each component from
/// the root on, and nothing is made. A symbolic link is followed when it lies in such a directory and belongs
/// to this user or root; then its target is held to the same rule. The data directory itself is taken as the
/// environment names it: who can replace it can replace the user's programs as well.
///
/// Each component is opened from the descriptor of the one before, without following links, and looked at
/// through its own descriptor. So the checked directory is the open one, also when another program renames it
/// meanwhile.
///
/// Threads: any. Failure: UnsafePath when the rule is broken or there is no such directory; std::system_error
/// when the system cannot make or open it for now.
class SafeDirectory {
public:
#ifdef O_PATH
    static constexpr int LOOK_FLAGS = O_PATH | O_DIRECTORY | O_CLOEXEC; ///< Needs no right to list it.
#else
    static constexpr int LOOK_FLAGS = O_RDONLY | O_DIRECTORY | O_CLOEXEC;
#endif

    /// More levels than this below the data directory are not made: paths come in datagrams, and a tree of
    /// thousands is hard to remove.
    static constexpr std::size_t MAX_LEVELS = 16;

    /// The absolute `path`, opened; what is missing below `home` is made.
    static SafeDirectory Open(const std::string& path, const std::string& home);

    /// The one name of the directory, without links and dots, whether it exists yet or not. Makes nothing.
    static std::string Resolve(const std::string& path, const std::string& home);

    /// Of this directory, for the *at calls. Not to be closed.
    int Number() const {
        return m_descriptor.Number();
    }

    /// Without links.
    const std::string& Path() const {
        return m_path;
    }

    /// A path for SQLite that leads to this very directory while this object lives: see DirectoryVfs.h.
    std::string PathOf(const std::string& file) const;

    SafeDirectory(std::string path, SystemTool::IO::Descriptor descriptor)
        : m_path(std::move(path)), m_descriptor(std::move(descriptor)) {}

private:
    std::string m_path;
    SystemTool::IO::Descriptor m_descriptor;
};

} // namespace Sqlite
