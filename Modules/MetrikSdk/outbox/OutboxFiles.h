#pragma once

#include <string>

#include "Modules/MetrikSdk/Time.h"
#include "Modules/Sqlite/DatabaseFiles.h"
#include "Modules/Sqlite/SafeDirectory.h"

/// The outbox as files: the database and what SQLite keeps beside it, in a directory that is held open. Any
/// thread; failures are StoreErrors, with the system's words.
namespace MetrikSdk::outbox::OutboxFiles {

/// Opens the directory at `path`, by the rule of SafeDirectory; makes missing directories below `home`, 0700
/// under any umask. A directory that breaks the rule is a StoreError of the kind Unsafe.
Sqlite::SafeDirectory OpenDirectory(const std::string& path, const std::string& home);

/// Makes the file `name`, or narrows it: 0600 under any umask, and never wider in between. SQLite gives its
/// side files the mode of the database. What is there already, beside it too, must be this user's alone. Must
/// not be called while this process has the database open: closing any descriptor of a file drops the
/// process's POSIX locks on it.
Sqlite::Identity Prepare(const Sqlite::SafeDirectory& directory, const std::string& name);

/// Renames the database and its side files to a name with `now` in it and returns that name's path. Does
/// nothing and returns an empty text when `name` is not `identity`: another program was faster.
std::string SetAside(const Sqlite::SafeDirectory& directory, const std::string& name,
                     const Sqlite::Identity& identity, WallTime now);

} // namespace MetrikSdk::outbox::OutboxFiles
