#pragma once

#include <string>

#include <SQLiteCpp/Database.h>

#include "Tools/reportctl/terminal/Worklog.h"

namespace reportctl::store {

/// Makes sure of the database at `path`: mode 0600, write-ahead log, the tables of the current schema.
///
/// A new one is built under another name and gets its own in one step: nobody ever sees half a store, and one
/// that appears meanwhile is not overwritten. An older schema is migrated, with its rows, in one transaction.
/// A file that is no database, and a schema that is newer than this program, are left as they are. Side files without a
/// store, which may hold rows, are renamed; where that fails no new store is made beside them.
///
/// False when there is no store to go on with; the log has the reason. True in a dry run that would make it.
bool EnsureStore(terminal::Worklog& log, const std::string& path);

/// Opens the store that is there, never makes one. Throws SQLite::Exception.
SQLite::Database OpenStore(const std::string& path);

/// The same for a look at it: rows that a killed service left in the write-ahead log stay there when this is closed.
/// Otherwise the last one to close the store merges them into Report.db, and that would be a change.
SQLite::Database OpenStoreToLook(const std::string& path);

} // namespace reportctl::store
