#include "Modules/OrvekSqlite/Database.h"

#define SSR_EXPORT __attribute__((visibility("default")))

extern "C" {

/// A new database object without a file; null when there is no memory for one. An exception could not cross
/// into a program that expects a C function.
SSR_EXPORT ISqliteDatabase* CreateModule() {
    try {
        return new OrvekSqlite::Database();
    } catch (...) {
        return nullptr;
    }
}

/// Takes back what CreateModule made. The misspelling is the name that every program of the suite looks up.
SSR_EXPORT void DestoryModule(ISqliteDatabase* database) {
    delete static_cast<OrvekSqlite::Database*>(database);
}
}
