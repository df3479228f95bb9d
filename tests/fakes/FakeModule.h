#pragma once

#include <functional>
#include <utility>

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

    std::function<void()> onCreate;  ///< Called by the next "CreateModule" only.
    std::function<void()> onDestroy; ///< The same for "DestoryModule".

    static void CallOnce(std::function<void()>& hook) {
        if (const auto call = std::exchange(hook, nullptr))
            call();
    }
};
