#pragma once

#include "tests/fakes/FakePlugin.h"

/// What a fake plug-in's two exports were asked for, and what they are told to do.
struct FakeFactory {
    int created = 0;
    int destroyed = 0;
    bool createsNothing = false;
    Throws createThrows = Throws::Nothing;
    int* sequence = nullptr; ///< A counter that several plug-ins' fakes may share,
    int destroyedAt = 0;     ///< and what it said when an object was destroyed last.

    /// For "CreateModule": whether there is to be an object.
    bool Create() {
        ++created;
        ThrowIf(createThrows);
        return !createsNothing;
    }
    void Destroy() {
        ++destroyed;
        if (sequence != nullptr)
            destroyedAt = ++*sequence;
    }
};
