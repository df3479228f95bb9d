#include <fstream>
#include <string>

#include <gtest/gtest.h>

#include "SystemTool/Platform.h"

#ifdef __linux__
namespace {

/// How much of the mapped files is in this process's memory.
long ResidentFileKb() {
    std::ifstream status("/proc/self/status");
    for (std::string line; std::getline(status, line);)
        if (line.starts_with("RssFile:"))
            return std::stol(line.substr(8));
    return 0;
}

} // namespace

TEST(LetGoOfCode, TakesCodeOutOfMemoryAndTheProgramGoesOn) {
    const long before = ResidentFileKb();
    SystemTool::Platform::LetGoOfCode();
    const long after = ResidentFileKb(); // this call itself brings some pages back
    EXPECT_GT(after, 0);
    EXPECT_LT(after, before);
    EXPECT_THROW(static_cast<void>(std::stol("no number")), std::invalid_argument);
}
#endif
