#pragma once

#include <sqlite3.h>

#include "Modules/Sqlite/DatabaseFiles.h"

namespace Sqlite {

/// Call this when the log or the index of the open database has lost its name, before the connection is
/// closed. It merges into the database the rows that only this connection can still read. Returns true when
/// no row is lost.
///
/// When another program has begun a new log since then, that one is the database's log now. Merging the old
/// log into a database with a new log would damage it, so the rows of the old log are lost.
bool RescueDeletedLog(sqlite3* connection, SideFileWatch& files) noexcept;

} // namespace Sqlite
