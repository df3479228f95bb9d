#pragma once

#include <string>

#include <SQLiteCpp/Database.h>

namespace reportctl::store {

/// Opens a database to read what is committed in it, with its -wal, and changes no file: neither the database
/// nor the files beside it, and it leaves none. A writer beside it is not held up. What the database's schema
/// defines is not trusted.
///
/// Beside a process that has it open, the -shm of that process is read. Without one, what a kill left in the
/// -wal is read through an index in this process's memory. Throws SQLite::Exception when it cannot be read
/// like that: when it is being made or moved right now, or when it has a -wal with rows and no -shm.
SQLite::Database OpenUnchanged(const std::string& path);

} // namespace reportctl::store
