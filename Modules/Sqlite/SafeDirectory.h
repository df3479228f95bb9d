#pragma once

#include <string>

#include <fcntl.h>

#include "SystemTool/IO/Descriptor.h"

namespace Sqlite {

/// An open directory in which only this user and root can make, swap or remove files.
///
/// The rule: a directory must belong to this user or root, and no other user may write to it. Below the
/// user's data directory (`home`), each component must keep the rule, and missing ones are made with mode
/// 0700. Anywhere else, each component from the root on must keep the rule, and nothing is made. A symbolic
/// link is followed when the directory that holds it keeps the rule and the link belongs to this user or
/// root. Then the link's target must keep the rule, too. On the way to a directory below it, `home` itself is
/// not checked, because it comes from the environment: a user who can replace it can replace this user's
/// programs as well.
///
/// Each component is opened relative to the descriptor of its parent, without following links, and is checked
/// through its own descriptor. So the checked directory is the open one, also when another program renames it
/// meanwhile.
///
/// Threads: any. Failure: UnsafePath when the path breaks the rule or there is no such directory;
/// std::system_error when the system cannot make or open the directory for now.
class SafeDirectory {
public:
#ifdef O_PATH
    /// Needs no right to list the directory.
    static constexpr int LOOK_FLAGS = O_PATH | O_DIRECTORY | O_CLOEXEC;
#else
    static constexpr int LOOK_FLAGS = O_RDONLY | O_DIRECTORY | O_CLOEXEC;
#endif

    /// The most levels that a path may have below the data directory. Paths come in datagrams, and a tree of
    /// thousands of levels is hard to remove.
    static constexpr std::size_t MAX_LEVELS = 16;

    /// Opens the directory at the absolute `path`. Makes the components below `home` that are missing.
    static SafeDirectory Open(const std::string& path, const std::string& home);

    /// The directory's path without links and dots, so that each directory has only one such path. The
    /// directory need not exist. Makes nothing.
    static std::string Resolve(const std::string& path, const std::string& home);

    /// The directory's descriptor, for the *at calls. Do not close it.
    int Number() const {
        return m_descriptor.Number();
    }

    /// The directory's path, without links.
    const std::string& Path() const {
        return m_path;
    }

    /// A path for SQLite to `file` in this directory. While this object lives, it leads to this directory,
    /// also when the directory is renamed. SQLite must open it with DirectoryVfs.
    std::string PathOf(const std::string& file) const;

    SafeDirectory(std::string path, SystemTool::IO::Descriptor descriptor)
        : m_path(std::move(path)), m_descriptor(std::move(descriptor)) {}

private:
    std::string m_path;
    SystemTool::IO::Descriptor m_descriptor;
};

} // namespace Sqlite
