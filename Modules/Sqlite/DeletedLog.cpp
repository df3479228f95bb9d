#include "Modules/Sqlite/DeletedLog.h"

namespace Sqlite {
namespace {

/// A close would merge the log that is open, and delete the one that has the name.
void LeaveTheFilesOnClose(sqlite3* connection) {
    ::sqlite3_db_config(connection, SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
}

} // namespace

bool RescueDeletedLog(sqlite3* connection, SideFileWatch& files) noexcept {
    LeaveTheFilesOnClose(connection);
    if (files.LogIsInPlace()) // the index alone is gone: the log is read when it is opened again
        return true;
    if (files.HasOtherLog())
        return false;
    int frames = -1;
    int merged = -1;
    ::sqlite3_busy_timeout(connection, 0); // a reader that stays is no reason to wait here
    ::sqlite3_wal_checkpoint_v2(connection, "main", SQLITE_CHECKPOINT_FULL, &frames, &merged);
    return frames >= 0 && frames == merged;
}

} // namespace Sqlite
