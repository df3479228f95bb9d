#include "tests/Client/ScriptedClock.h"

#include <atomic>

using std::chrono::steady_clock;

namespace {

std::atomic<steady_clock::rep> g_ahead = 0;

} // namespace

void AdvanceSteadyClock(std::chrono::seconds by) {
    g_ahead += steady_clock::duration(by).count();
}

// The names that the linker's option --wrap asks for.
// NOLINTBEGIN(bugprone-*,cert-*)
extern "C" steady_clock::time_point __real__ZNSt6chrono3_V212steady_clock3nowEv();

extern "C" steady_clock::time_point __wrap__ZNSt6chrono3_V212steady_clock3nowEv() {
    return __real__ZNSt6chrono3_V212steady_clock3nowEv() + steady_clock::duration(g_ahead);
}
// NOLINTEND(bugprone-*,cert-*)
