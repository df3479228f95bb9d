#pragma once

#include <cstdlib>

namespace SystemTool {

/// Call this first in a new thread. The heap of the program gives a thread a cache with the thread's first
/// allocation. When there is no memory for the cache, jemalloc 5.3 ends the process. At the thread's begin
/// there is memory, because the thread has just got its stack.
inline void PrepareHeap() noexcept {
    // volatile: otherwise the compiler leaves the pair out
    // NOLINTBEGIN(cppcoreguidelines-no-malloc): it is the heap that is wanted, and nothing is kept
    void* const volatile memory = std::malloc(1);
    std::free(memory);
    // NOLINTEND(cppcoreguidelines-no-malloc)
}

} // namespace SystemTool
