#include "Modules/OrvekSqlite/Database.h"

#include <vector>

#include <dlfcn.h>

#define SSR_EXPORT __attribute__((visibility("default")))

namespace {

/// Keeps an object that another thread may still use, and this library with it. Destruction like that comes
/// once at most: in a process that exits while its other threads go on.
void LeaveBehind(const OrvekSqlite::Database* database) {
    static auto* const left = new std::vector<const OrvekSqlite::Database*>;
    left->push_back(database);
    Dl_info self{};
    if (::dladdr(&left, &self) != 0)
        (void)::dlopen(self.dli_fname, RTLD_NOW | RTLD_NOLOAD | RTLD_NODELETE);
}

} // namespace

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
    auto* const own = static_cast<OrvekSqlite::Database*>(database);
    if (own == nullptr || own->Finish())
        delete own;
    else
        LeaveBehind(own);
}
}
