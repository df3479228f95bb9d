#pragma once

#include <sqlite3.h>

namespace Sqlite {

/// What an error of SQLite is about. The kinds are named for what the caller can do.
enum class ErrorKind {
    Wait,      ///< The file is sound, but locked, or the disk or the memory is full. Try again later.
    Reopen,    ///< The open file cannot be used any more. Open its path again.
    Damage,    ///< The file is damaged, or it is no database.
    Statement, ///< The statement itself is at fault.
};

/// `code` is a result code of SQLite; it may be an extended one.
inline ErrorKind KindOf(int code) {
    switch (code & 0xff) {
    case SQLITE_BUSY:
    case SQLITE_LOCKED:
    case SQLITE_FULL:
    case SQLITE_NOMEM:
    case SQLITE_INTERRUPT:
        return ErrorKind::Wait;
    case SQLITE_READONLY:
    case SQLITE_IOERR:
    case SQLITE_CANTOPEN:
    case SQLITE_PROTOCOL:
        return ErrorKind::Reopen;
    case SQLITE_CORRUPT:
    case SQLITE_NOTADB:
        return ErrorKind::Damage;
    default:
        return ErrorKind::Statement;
    }
}

} // namespace Sqlite
