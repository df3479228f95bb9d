#pragma once

#include <string>
#include <vector>

#include "Plugin/IMetrikSdk.h"
#include "tests/fakes/FakeFactory.h"

/// What the fake SDK was asked, over all of its objects and in order, and what it answers.
struct FakeSdkState : FakeFactory {
    /// One call, by the slot that was called (0 is the interface's first) and the object's number (1 is the
    /// first made).
    struct Call {
        int slot;
        int object;
        std::vector<std::string> arguments;

        bool operator==(const Call&) const = default;
    };

    std::vector<Call> calls;
    IMetrikSdk::Callback onFailure = nullptr; ///< As the last InitSdk gave them.
    IMetrikSdk::Callback onSuccess = nullptr;
    bool initAnswer = true;
    bool reportAnswer = true;
    Throws initThrows = Throws::Nothing;
    Throws reportThrows = Throws::Nothing;
};

inline FakeSdkState& FakeSdk() {
    return FakeState<FakeSdkState>("libMetrikSdk.dylib");
}
