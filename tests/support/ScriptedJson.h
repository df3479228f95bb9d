#pragma once

#include <string>

#include "tests/fakes/FakePlugin.h"

/// Replaces the result of parsing a JSON text in the core's code that is linked into the test.
struct ScriptedJson {
    Throws throws = Throws::Nothing;
    std::string error; ///< When not empty, the parser reports this error.
};

extern ScriptedJson g_scriptedJson;
