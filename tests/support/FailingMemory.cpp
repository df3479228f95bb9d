#include "tests/support/FailingMemory.h"

#include <cerrno>
#include <cstdlib>
#include <new>

namespace {

// Plain numbers, because reading them never allocates.
thread_local int g_before = -1; // allocations that succeed before the first one fails; negative: none fails
thread_local int g_failing = 0;
thread_local int g_failed = 0;

bool Fails() {
    if (g_before < 0)
        return false;
    if (g_before > 0) {
        --g_before;
        return false;
    }
    if (g_failed == g_failing)
        return false;
    ++g_failed;
    return true;
}

} // namespace

FailingMemory::FailingMemory(int first, int count) {
    g_failed = 0;
    g_failing = count;
    g_before = first - 1;
}

FailingMemory::~FailingMemory() {
    g_before = -1;
}

int FailingMemory::Failed() {
    return g_failed;
}

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define HAS_HEAP_OF_A_SANITIZER // gcc's way to say it
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define HAS_HEAP_OF_A_SANITIZER // clang's way
#endif
#endif

#ifdef HAS_HEAP_OF_A_SANITIZER

const bool FailingMemory::FAILS_IN_C = false;

// These replace operator delete, too, which frees what these operators new return.
void* operator new(std::size_t bytes) {
    void* const memory = Fails() ? nullptr : std::malloc(bytes);
    if (memory == nullptr)
        throw std::bad_alloc();
    return memory;
}

void operator delete(void* memory) noexcept {
    std::free(memory);
}

void operator delete(void* memory, std::size_t) noexcept {
    std::free(memory);
}

#else

const bool FailingMemory::FAILS_IN_C = true;

// The program's functions come before those of the C library, also for the libraries that the program loads.
// They return memory of the C library, which its free can release.
extern "C" {

void* __libc_malloc(std::size_t bytes);
void* __libc_calloc(std::size_t count, std::size_t bytes);
void* __libc_realloc(void* memory, std::size_t bytes);

__attribute__((visibility("default"))) void* malloc(std::size_t bytes) {
    if (!Fails())
        return __libc_malloc(bytes);
    errno = ENOMEM;
    return nullptr;
}

__attribute__((visibility("default"))) void* calloc(std::size_t count, std::size_t bytes) {
    if (!Fails())
        return __libc_calloc(count, bytes);
    errno = ENOMEM;
    return nullptr;
}

__attribute__((visibility("default"))) void* realloc(void* memory, std::size_t bytes) {
    if (!Fails())
        return __libc_realloc(memory, bytes);
    errno = ENOMEM;
    return nullptr;
}
}

#endif
