#pragma once

#include <string>

#include "Modules/MetrikSdk/Time.h"
#include "Modules/Sqlite/DatabaseFiles.h"
#include "Modules/Sqlite/SafeDirectory.h"

/// The files of the outbox: the database, and the files that SQLite keeps beside it, in a directory that is
/// held open. Threads: any. Failure: StoreError, with the system's text.
namespace MetrikSdk::outbox::OutboxFiles {

/// Opens the directory at `path`, by the rule of SafeDirectory. Makes missing directories below `home`, with
/// mode 0700 under any umask. A directory that breaks the rule is a StoreError of the kind Unsafe.
Sqlite::SafeDirectory OpenDirectory(const std::string& path, const std::string& home);

/// Makes the file `name` with mode 0600 under any umask, or gives an existing file this mode. The mode is
/// never wider in between. SQLite gives the database's mode to its side files. When the file or a side file
/// exists already, it must belong to this user or root, and no other user may write to it. Returns the file's
/// identity.
///
/// Do not call this while this process has the database open: closing any descriptor of a file drops the
/// process's POSIX locks on it.
Sqlite::Identity Prepare(const Sqlite::SafeDirectory& directory, const std::string& name);

/// Renames the database and its side files to a name with `now` in it, and returns the new path. When the
/// file `name` is not `identity` any more, another program was faster; then this does nothing and returns an
/// empty text.
std::string SetAside(const Sqlite::SafeDirectory& directory, const std::string& name,
                     const Sqlite::Identity& identity, WallTime now);

} // namespace MetrikSdk::outbox::OutboxFiles
