#pragma once

#include <optional>
#include <string>
#include <utility>

#include <sys/types.h>

#include "Modules/MetrikSdk/Time.h"

/// The outbox as files: the database and what SQLite keeps beside it. Any thread; failures are StoreErrors of
/// the kind Reopen, with the system's words.
namespace MetrikSdk::outbox::OutboxFiles {

/// Device and inode: whether a path still names the file that was opened.
using Identity = std::pair<dev_t, ino_t>;

/// Makes the absolute `directory` with every missing parent, each 0700 whatever the umask.
void MakeDirectory(const std::string& directory);

/// Makes the file, or narrows it: 0600 whatever the umask, and never wider in between. SQLite gives its side
/// files the mode of the database. Must not be called while this process has the database open: closing any
/// descriptor of a file drops the process's POSIX locks on it.
Identity Prepare(const std::string& path);

/// Nothing when there is no such file.
std::optional<Identity> IdentityOf(const std::string& path);

/// Renames the database and its side files to a name with `now` in it and returns that name. Does nothing and
/// returns an empty text when `path` does not name `identity`: somebody else was faster.
std::string SetAside(const std::string& path, const Identity& identity, WallTime now);

} // namespace MetrikSdk::outbox::OutboxFiles
