#pragma once

#include <vector>

/// The pauses of Poco::Thread::sleep in the core's code that is linked into the test, in milliseconds. None
/// of them really sleeps. Safe from any thread.
std::vector<long> Pauses();
