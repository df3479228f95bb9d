#pragma once

#include <vector>

/// The pauses, in milliseconds, that the core's code in this test asked of Poco::Thread::sleep. No pause
/// really sleeps. Safe from any thread.
std::vector<long> Pauses();
