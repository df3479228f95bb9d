#pragma once

#include "tests/fakes/FakePlugin.h"

/// How often the two exports of a fake plug-in were called, and what a test tells them to do.
struct FakeFactory {
    int created = 0;
    int destroyed = 0;
    bool createsNothing = false;
    Throws createThrows = Throws::Nothing;
    int* sequence = nullptr; ///< A counter that the fakes of several plug-ins may share.
    int destroyedAt = 0;     ///< The counter's value when an object was last destroyed.

    /// For "CreateModule": true when it is to make an object.
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
