#include <exception>

#include "Modules/MetrikSdk/MetrikSdk.h"

// The plug-in's two doors. The second one's misspelling is the suite's.

extern "C" __attribute__((visibility("default"))) IMetrikSdk* CreateModule() {
    try {
        return new Metrik::MetrikSdk(Metrik::OutboxRegistry::Instance());
    } catch (const std::exception&) { // the caller knows what a null object means
        return nullptr;
    }
}

extern "C" __attribute__((visibility("default"))) void DestoryModule(IMetrikSdk* module) {
    delete static_cast<Metrik::MetrikSdk*>(module);
}
