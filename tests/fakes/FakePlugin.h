#pragma once

#include <stdexcept>
#include <string>

#include <Poco/Exception.h>
#include <dlfcn.h>

#include "SystemTool/IO/Directory.h"

#define FAKE_EXPORT extern "C" __attribute__((visibility("default")))

/// What a scripted operation throws.
enum class Throws { Nothing, Poco, Std, Other };

inline void ThrowIf(Throws what) {
    switch (what) {
    case Throws::Nothing:
        return;
    case Throws::Poco:
        throw Poco::IOException("scripted");
    case Throws::Std:
        throw std::runtime_error("scripted");
    case Throws::Other:
        throw 42;
    }
}

/// The state of the fake plug-in that lies beside this executable. The plug-in exports it as "FakeState". The
/// library stays open, so that the state outlives every loader.
template <typename State>
State& FakeState(const std::string& library) {
    void* handle = ::dlopen((SystemTool::IO::Directory::GetExcutableDirectory() + library).c_str(), RTLD_NOW);
    void* state = handle != nullptr ? ::dlsym(handle, "FakeState") : nullptr;
    if (state == nullptr)
        throw std::runtime_error("no fake " + library + " beside the test");
    return *reinterpret_cast<State* (*)()>(state)();
}
