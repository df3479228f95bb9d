#pragma once

namespace Sqlite {

/// The name of a way to open files that differs from SQLite's own in one thing: it takes a path as it is.
///
/// SQLite replaces each link of a path by what it leads to. A path through an open descriptor,
/// /proc/self/fd/7/file, is such a link, and resolved it would be an ordinary path again, which leads
/// elsewhere when a directory on its way is swapped. Taken as it is, every file that SQLite opens beside the
/// database, now or later, lies in the very directory that was checked.
///
/// Registered with the first call. Throws std::bad_alloc when SQLite cannot be set up.
const char* DirectoryVfs();

} // namespace Sqlite
