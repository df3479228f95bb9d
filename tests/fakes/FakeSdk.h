#pragma once

#include <string>
#include <vector>

#include "Plugin/IMetrikSdk.h"
#include "tests/fakes/FakePlugin.h"

/// What the fake SDK was asked, over all of its objects and in order, and what it answers.
struct FakeSdkState {
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
    int created = 0;
    int destroyed = 0;
    bool createsNothing = false;
    Throws createThrows = Throws::Nothing;
    int* sequence = nullptr; ///< A counter that both destinations' fakes may share,
    int destroyedAt = 0;     ///< and what it said when an object was destroyed last.
};

inline FakeSdkState& FakeSdk() {
    return FakeState<FakeSdkState>("libMetrikSdk.dylib");
}
