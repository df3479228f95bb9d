#pragma once

#include "tests/fakes/FakePlugin.h"

/// The interface of the loader's test plug-ins.
class IFakeModule {
public:
    virtual int Answer() = 0;

protected:
    ~IFakeModule() = default;
};

/// How often the plug-in's two exports were called, and with what.
struct FakeModuleState {
    int created = 0;
    int destroyed = 0;
    IFakeModule* lastDestroyed = nullptr;
};
