#include "Modules/OrvekSqlite/Database.h"

#include <vector>

#include <sqlite3.h>

#define SSR_EXPORT __attribute__((visibility("default")))

namespace {

/// SQLite counts the bytes of every allocation, under a mutex of the whole process; the count is not used.
/// Without it a statement costs a quarter less. Possible before the process first uses SQLite; later the call
/// changes nothing.
void DoWithoutStatistics() {
    sqlite3_config(SQLITE_CONFIG_MEMSTATUS, 0);
}

/// Keeps an object that another thread may still use: in a process that exits while its other threads go on.
/// The list tells leak checkers that this is no leak. The code stays in memory anyway, see
/// cmake/Plugin.cmake.
void LeaveBehind(const OrvekSqlite::Database* database) {
    static auto* const left = new std::vector<const OrvekSqlite::Database*>;
    left->push_back(database);
}

} // namespace

extern "C" {

/// A new database object without a file; null when there is no memory for one. An exception could not cross
/// into a program that expects a C function.
SSR_EXPORT ISqliteDatabase* CreateModule() {
    DoWithoutStatistics();
    try {
        return new OrvekSqlite::Database();
    } catch (...) {
        return nullptr;
    }
}

/// Takes back what CreateModule made. The misspelling is the name that every program of the suite looks up.
SSR_EXPORT void DestoryModule(ISqliteDatabase* database) {
    auto* const own = static_cast<OrvekSqlite::Database*>(database);
    if (own == nullptr || own->Finish())
        delete own;
    else
        LeaveBehind(own);
}
}
