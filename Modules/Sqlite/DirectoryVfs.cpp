#include "Modules/Sqlite/DirectoryVfs.h"

#include <cstring>
#include <new>

#include <sqlite3.h>

namespace Sqlite {
namespace {

constexpr const char* NAME = "hublink-directory";

int TakeAsItIs(sqlite3_vfs* /*vfs*/, const char* path, int size, char* full) {
    if (std::strlen(path) >= static_cast<std::size_t>(size))
        return SQLITE_CANTOPEN;
    std::strcpy(full, path); // NOLINT: the size was looked at
    return SQLITE_OK;
}

/// A copy of SQLite's default VFS, with one function replaced. The other functions work with any object that
/// has the same data behind it, so they work with the copy.
sqlite3_vfs Make() {
    const auto* own = ::sqlite3_vfs_find(nullptr);
    if (own == nullptr)
        throw std::bad_alloc();
    auto vfs = *own;
    vfs.zName = NAME;
    vfs.pNext = nullptr;
    vfs.xFullPathname = &TakeAsItIs;
    return vfs;
}

} // namespace

const char* DirectoryVfs() {
    // Never destroyed: connections may outlive static objects.
    static auto& vfs = *new sqlite3_vfs(Make());
    static const int result = ::sqlite3_vfs_register(&vfs, 0);
    if (result != SQLITE_OK)
        throw std::bad_alloc();
    return NAME;
}

} // namespace Sqlite
