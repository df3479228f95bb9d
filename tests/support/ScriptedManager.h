#pragma once

#include "tests/fakes/FakePlugin.h"

/// What the analytics manager throws instead of its work, when the core's code in this test calls its Init or
/// Update.
extern Throws g_managerThrows;
