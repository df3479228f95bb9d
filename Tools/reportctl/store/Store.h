#pragma once

#include <string>

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Exception.h>

#include "Tools/reportctl/terminal/Worklog.h"

namespace reportctl::store {

/// Makes the database at `path`, or brings it up to date: mode 0600, write-ahead log, the tables of the
/// current schema.
///
/// A new store is built under another name and then gets its own name in one step. So no program ever sees
/// half a store, and a store that appears meanwhile is not overwritten. An older schema is migrated in one
/// transaction, and its rows stay. A file that is not a database, and a schema that is newer than this
/// program, are left as they are. Side files without a store may hold rows, so they are renamed. When that
/// fails, no new store is made beside them.
///
/// The file of a store that an older set-up made may not be able to shrink. Such a store is rewritten: always
/// up to 64 MiB, a larger one only with `compact`. Meanwhile it needs its size on the disk again, and the
/// service waits.
///
/// Returns false when there is no usable store; `log` has printed the reason. Returns true when a dry run
/// would make it.
bool EnsureStore(terminal::Worklog& log, const std::string& path, bool compact);

/// Throws std::runtime_error when there is no store at the path, or when this user may not see the path. The
/// message about a missing store names the command that makes it.
void RequireStore(const std::string& path);

/// Runs `work`. When SQLite reports an error, the path of the database is put before its text, because
/// SQLite's texts name no file.
template <typename Work>
auto Naming(const std::string& path, const Work& work) {
    try {
        return work();
    } catch (const SQLite::Exception& error) {
        throw SQLite::Exception(path + ": " + error.what(), error.getErrorCode());
    }
}

/// Opens the database for reading and writing. Never makes one. Throws what RequireStore throws, and
/// SQLite::Exception.
SQLite::Database OpenStore(const std::string& path);

/// Opens the database as OpenStore does, but for reading: statements that would change it fail. A write-ahead
/// log that is there stays as it is when the database is closed, also when the service ends before. Otherwise
/// the last process that closes the store merges the rows into Report.db, and that would be a change.
SQLite::Database OpenStoreToLook(const std::string& path);

/// Opens the database for commands that look at it for a moment, as OpenUnchanged does. Where that cannot
/// read because a -shm is missing, the owner makes it anew, and changes nothing else.
SQLite::Database OpenToGlance(const std::string& path);

/// Opens the database for commands that read much. The owner reads with SQLite's locks, so that a long read
/// is correct beside any writer. Another user, such as an administrator, reads as OpenUnchanged does, and so
/// leaves no file that the owner could not use. The owner reads like that, too, when the disk is full or
/// read-only.
SQLite::Database OpenToRead(const std::string& path);

} // namespace reportctl::store
