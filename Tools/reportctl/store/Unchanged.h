#pragma once

#include <string>

#include <SQLiteCpp/Database.h>

namespace reportctl::store {

/// Opens a database to read the committed rows, also those in its -wal. Changes no file: neither the database
/// nor the files beside it, and it makes no file. A writer does not have to wait for it. The definitions in
/// the database's schema are not trusted.
///
/// When another process has the database open, that process's -shm is read. When no process has it open, rows
/// that a killed process left in the -wal are read with an index in this process's memory. Throws
/// SQLite::Exception when reading without changes is not possible: while the database is being made or moved,
/// or when there is a -wal with rows and no -shm.
SQLite::Database OpenUnchanged(const std::string& path);

/// Whether OpenUnchanged cannot read the database because there is a -wal with rows and no -shm. A backup
/// that left the -shm out is restored like that.
bool LacksIndex(const std::string& path);

} // namespace reportctl::store
