#include <cstdlib>
#include <filesystem>

// A program that links this file has its temporary directories in memory, when the system offers that. Its
// tests open and close databases some hundred times. On a disk that other tests use, each sync may take a
// tenth of a second.

namespace {

constexpr auto MEMORY = "/dev/shm";

[[maybe_unused]] const int g_result =
    std::filesystem::is_directory(MEMORY) ? ::setenv("TMPDIR", MEMORY, 1) : 0;

} // namespace
