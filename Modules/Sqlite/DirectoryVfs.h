#pragma once

namespace Sqlite {

/// The name of a VFS, the layer through which SQLite opens files. It differs from SQLite's default VFS in one
/// thing: it takes a path as it is.
///
/// SQLite's default VFS replaces each link of a path by the link's target. /proc/self/fd/7/file is a path
/// through an open descriptor, and /proc/self/fd/7 is such a link. The result would be an ordinary path
/// again, and an ordinary path leads elsewhere when another program swaps a directory on the way. With this
/// VFS, every file that SQLite opens beside the database, now or later, is in the directory that was checked.
///
/// The first call registers the VFS. Throws std::bad_alloc when SQLite cannot be set up.
const char* DirectoryVfs();

} // namespace Sqlite
