#pragma once

#include <sqlite3.h>

#include "Modules/Sqlite/DatabaseFiles.h"

namespace Sqlite {

/// To be called when a file beside the open database has lost its name, before the connection is closed.
/// Brings into the database what only the connection can still read. True: nothing is lost.
///
/// A log that another program has begun since then is the database's log now. Merging the old one into a
/// database that has a new one would damage it, so the rows of the old one are lost.
bool RescueDeletedLog(sqlite3* connection, SideFileWatch& files) noexcept;

} // namespace Sqlite
