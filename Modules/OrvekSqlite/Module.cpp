#include "Modules/OrvekSqlite/Database.h"

#include <vector>

#include <sqlite3.h>

#define SSR_EXPORT __attribute__((visibility("default")))

namespace {

/// SQLite counts the bytes of every allocation, under a mutex of the whole process. We do not use that count.
/// Without it a statement takes a quarter less time. This call works only before the process first uses
/// SQLite; later it changes nothing.
void DoWithoutStatistics() {
    sqlite3_config(SQLITE_CONFIG_MEMSTATUS, 0);
}

/// Keeps an object that another thread may still use, because the process exits while its other threads go
/// on. The list holds a pointer to it, so leak checkers do not report a leak. The code stays in memory
/// anyway, see cmake/Plugin.cmake.
void LeaveBehind(const OrvekSqlite::Database* database) {
    static auto* const left = new std::vector<const OrvekSqlite::Database*>;
    left->push_back(database);
}

} // namespace

extern "C" {

/// Returns a new database object without a file, or null when there is no memory for it. It must not throw,
/// because the calling program expects a C function.
SSR_EXPORT ISqliteDatabase* CreateModule() {
    DoWithoutStatistics();
    try {
        return new OrvekSqlite::Database();
    } catch (...) {
        return nullptr;
    }
}

/// Destroys an object of CreateModule. The misspelling is the name that every program of the suite looks up.
SSR_EXPORT void DestoryModule(ISqliteDatabase* database) {
    auto* const own = static_cast<OrvekSqlite::Database*>(database);
    if (own == nullptr || own->Finish())
        delete own;
    else
        LeaveBehind(own);
}
}
