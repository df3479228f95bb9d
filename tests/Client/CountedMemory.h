#pragma once

#include <cstddef>

/// The C++ heap of the test program, as one thread sees it.
struct CountedMemory {
    static thread_local bool isUsedUp; ///< When true, each allocation of this thread throws.
    static thread_local std::size_t allocations;
};
