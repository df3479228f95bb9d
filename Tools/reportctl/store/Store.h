#pragma once

#include <string>

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Exception.h>

#include "Tools/reportctl/terminal/Worklog.h"

namespace reportctl::store {

/// Makes sure of the database at `path`: mode 0600, write-ahead log, the tables of the current schema.
///
/// A new one is built under another name and gets its own in one step: no program ever sees half a store, and
/// one that appears meanwhile is not overwritten. An older schema is migrated, with its rows, in one
/// transaction. A file that is no database, and a schema that is newer than this program, are left as they
/// are. Side files without a store, which may hold rows, are renamed; where that fails no new store is made
/// beside them.
///
/// A store that an older set-up made, whose file cannot shrink, is rewritten: up to 64 MiB always, a larger
/// one with `compact`. That takes the disk space of another one meanwhile, and the service waits.
///
/// False when there is no store to go on with; the log has the reason. True in a dry run that would make it.
bool EnsureStore(terminal::Worklog& log, const std::string& path, bool compact);

/// Throws std::runtime_error, with what to do about it, when there is no store at the path, or the user may
/// not see it.
void RequireStore(const std::string& path);

/// Does the work, and puts the name of the database before the words of SQLite, which name none.
template <typename Work>
auto Naming(const std::string& path, const Work& work) {
    try {
        return work();
    } catch (const SQLite::Exception& error) {
        throw SQLite::Exception(path + ": " + error.what(), error.getErrorCode());
    }
}

/// Opens the database that is there, never makes one. Throws std::runtime_error, with what to do about it,
/// when it is missing, and SQLite::Exception.
SQLite::Database OpenStore(const std::string& path);

/// The same for a look at it: rows that a killed service left in the write-ahead log stay there when this is
/// closed. Otherwise the last one to close the store merges them into Report.db, and that would be a change.
SQLite::Database OpenStoreToLook(const std::string& path);

/// For commands that read much. The owner reads with SQLite's own locks, so that a long read is sound beside
/// any writer. Another user, an administrator, reads as OpenUnchanged does, and leaves no file that the owner
/// could not use.
SQLite::Database OpenToRead(const std::string& path);

} // namespace reportctl::store
