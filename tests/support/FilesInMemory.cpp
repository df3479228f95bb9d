#include <cstdlib>
#include <filesystem>

// A program that links this has its temporary directories in memory, where the system has a place for that.
// Its tests open and close databases some hundred times, and on a disk that other tests keep busy each of the
// syncs may take a tenth of a second.

namespace {

constexpr auto MEMORY = "/dev/shm";

[[maybe_unused]] const int g_result =
    std::filesystem::is_directory(MEMORY) ? ::setenv("TMPDIR", MEMORY, 1) : 0;

} // namespace
