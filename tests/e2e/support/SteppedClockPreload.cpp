// Loaded into the program before the C library. It replaces the C library's functions for the wall clock by
// functions that add the seconds in a file; see SteppedClock.h. Other clocks do not change, nor does the
// machine's own wall clock.

#include <cstdint>
#include <cstdlib>
#include <ctime>

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <unistd.h>

namespace {

const std::int64_t* g_step = nullptr; ///< The seconds in the file. The test may change them at any time.

__attribute__((constructor)) void MapTheFile() {
    const int file = open(std::getenv("SSR_STEPPED_CLOCK_FILE"), O_RDONLY | O_CLOEXEC);
    void* const mapped = mmap(nullptr, sizeof(std::int64_t), PROT_READ, MAP_SHARED, file, 0);
    if (mapped == MAP_FAILED)
        abort();
    g_step = static_cast<const std::int64_t*>(mapped);
    close(file);
}

std::int64_t Step() {
    return g_step == nullptr ? 0 : __atomic_load_n(g_step, __ATOMIC_RELAXED);
}

} // namespace

#define REPLACEMENT extern "C" __attribute__((visibility("default")))

REPLACEMENT int clock_gettime(clockid_t clock, timespec* time) noexcept {
    const auto result = syscall(SYS_clock_gettime, clock, time);
    if (result == 0 && (clock == CLOCK_REALTIME || clock == CLOCK_REALTIME_COARSE))
        time->tv_sec += Step();
    return static_cast<int>(result);
}

REPLACEMENT int gettimeofday(timeval* time, void*) noexcept {
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    *time = {now.tv_sec, now.tv_nsec / 1000};
    return 0;
}

REPLACEMENT time_t time(time_t* time) noexcept {
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    if (time != nullptr)
        *time = now.tv_sec;
    return now.tv_sec;
}
