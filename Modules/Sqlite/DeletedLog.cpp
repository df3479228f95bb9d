#include "Modules/Sqlite/DeletedLog.h"

namespace Sqlite {
namespace {

/// By default, a close would merge the log that is open, and then delete the other file that now has the
/// log's name.
void LeaveTheFilesOnClose(sqlite3* connection) {
    ::sqlite3_db_config(connection, SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
}

} // namespace

bool RescueDeletedLog(sqlite3* connection, SideFileWatch& files) noexcept {
    LeaveTheFilesOnClose(connection);
    if (files.LogIsInPlace()) // only the index is gone: the next open reads the log again
        return true;
    if (files.HasOtherLog())
        return false;
    int frames = -1;
    int merged = -1;
    ::sqlite3_busy_timeout(connection, 0); // do not wait here: a reader may stay for long
    ::sqlite3_wal_checkpoint_v2(connection, "main", SQLITE_CHECKPOINT_FULL, &frames, &merged);
    return frames >= 0 && frames == merged;
}

} // namespace Sqlite
