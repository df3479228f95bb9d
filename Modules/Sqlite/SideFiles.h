#pragma once

#include <array>

namespace Sqlite {

/// What SQLite adds to the name of a database for the files beside it: the write-ahead log, its index, and
/// the journal of a database without such a log. The first and the last may hold rows that the database does
/// not have yet.
inline constexpr std::array SIDE_FILE_SUFFIXES{"-wal", "-shm", "-journal"};

} // namespace Sqlite
