#pragma once

#include <chrono>

/// Replaces std::chrono::steady_clock in the test programs: from now on, it is ahead by this much more.
void AdvanceSteadyClock(std::chrono::seconds by);
