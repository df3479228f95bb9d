#include "tests/Client/CountedMemory.h"

#include <cstdlib>
#include <new>

thread_local bool CountedMemory::isUsedUp = false;
thread_local std::size_t CountedMemory::allocations = 0;

// NOLINTBEGIN(cppcoreguidelines-no-malloc): here the heap begins

void* operator new(std::size_t bytes) {
    ++CountedMemory::allocations;
    void* const memory = CountedMemory::isUsedUp ? nullptr : std::malloc(bytes);
    return memory != nullptr ? memory : throw std::bad_alloc();
}

void operator delete(void* memory) noexcept {
    std::free(memory);
}

void operator delete(void* memory, std::size_t) noexcept {
    std::free(memory);
}

// NOLINTEND(cppcoreguidelines-no-malloc)
