#pragma once

#include <array>

namespace Sqlite {

/// What SQLite adds to the name of a database for the files beside it: the write-ahead log, its index, and
/// the journal of a database without such a log. The log and the journal may hold data that is in no other
/// file.
inline constexpr std::array SIDE_FILE_SUFFIXES{"-wal", "-shm", "-journal"};

} // namespace Sqlite
