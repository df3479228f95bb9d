#pragma once

#include <string>
#include <vector>

#include "Plugin/IMetrikSdk.h"
#include "tests/fakes/FakeFactory.h"

/// The calls that all objects of the fake SDK received, in order, and what they answer.
struct FakeSdkState : FakeFactory {
    /// One call: `slot` is the operation's place in the interface (the first is 0), `object` is the number of
    /// the object (the first that was made is 1).
    struct Call {
        int slot;
        int object;
        std::vector<std::string> arguments;

        bool operator==(const Call&) const = default;
    };

    std::vector<Call> calls;
    IMetrikSdk::Callback onFailure = nullptr; ///< The callback that the last InitSdk got.
    IMetrikSdk::Callback onSuccess = nullptr;
    bool initAnswer = true;
    bool reportAnswer = true;
    Throws initThrows = Throws::Nothing;
    Throws reportThrows = Throws::Nothing;
};

inline FakeSdkState& FakeSdk() {
    return FakeState<FakeSdkState>("libMetrikSdk.dylib");
}
