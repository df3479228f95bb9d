#include "tests/fakes/FakeModule.h"

namespace {

FakeModuleState g_state;

#ifdef CREATE_THROWS
/// A class that only this library has.
class OwnError : public std::exception {
public:
    const char* what() const noexcept override { return "the plug-in's own error"; }
};
#endif

class Module final : public IFakeModule {
public:
    int Answer() override { return 42; }
};

} // namespace

FAKE_EXPORT FakeModuleState* FakeState() {
    return &g_state;
}

#ifndef WITHOUT_CREATE
FAKE_EXPORT IFakeModule* CreateModule() {
    ++g_state.created;
    FakeModuleState::CallOnce(g_state.onCreate);
#if defined(CREATE_THROWS)
    throw OwnError();
#elif defined(CREATES_NULL)
    return nullptr;
#else
    return new Module;
#endif
}
#endif

#ifndef WITHOUT_DESTORY
FAKE_EXPORT void DestoryModule(IFakeModule* module) {
    ++g_state.destroyed;
    FakeModuleState::CallOnce(g_state.onDestroy);
    g_state.lastDestroyed = module;
    delete static_cast<Module*>(module);
}
#endif
