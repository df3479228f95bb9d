#pragma once

#include <string>

#include "tests/fakes/FakePlugin.h"

/// What parsing a JSON text does instead of what it would, in the core's code that is linked into the test.
struct ScriptedJson {
    Throws throws = Throws::Nothing;
    std::string error; ///< When not empty, the parser's complaint.
};

extern ScriptedJson g_scriptedJson;
