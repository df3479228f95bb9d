#include <exception>

#include <sqlite3.h>

#include "Modules/MetrikSdk/Sdk.h"

// The two functions that the plug-in exports. The misspelling of the second one is the suite's.

extern "C" __attribute__((visibility("default"))) IMetrikSdk* CreateModule() {
    // This must come before the process first uses SQLite; later it has no effect. SQLite's allocation
    // statistics take a lock for each allocation, and are not used. The local store's plug-in makes the same
    // call, but this plug-in is opened first.
    sqlite3_config(SQLITE_CONFIG_MEMSTATUS, 0);
    try {
        return new MetrikSdk::Sdk(MetrikSdk::process::OutboxRegistry::Instance());
    } catch (const std::exception&) { // the caller knows what a null object means
        return nullptr;
    }
}

extern "C" __attribute__((visibility("default"))) void DestoryModule(IMetrikSdk* module) {
    delete static_cast<MetrikSdk::Sdk*>(module);
}
