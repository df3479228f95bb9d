#include "tests/support/ScriptedSleep.h"

#include <mutex>
#include <thread>

namespace {

std::mutex g_mutex; // guards the pauses
std::vector<long> g_pauses;

} // namespace

// The linker redirects the core's calls of Poco::Thread::sleep to this function.
[[gnu::visibility("default")]] void
PauseInstead(long milliseconds) asm("__wrap__ZN4Poco10ThreadImpl9sleepImplEl");
void PauseInstead(long milliseconds) {
    {
        const std::lock_guard lock(g_mutex);
        g_pauses.push_back(milliseconds);
    }
    std::this_thread::yield();
}

std::vector<long> Pauses() {
    const std::lock_guard lock(g_mutex);
    return g_pauses;
}
