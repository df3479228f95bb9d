#include <stdexcept>
#include <string>

#include <gtest/gtest.h>
#include <unistd.h>

#include "SystemTool/Platform.h"
#include "tests/support/ProcessStatus.h"

#ifdef __linux__
namespace {

/// How much of the mapped files is in this process's memory.
long ResidentFileKb() {
    return NumberInStatusOf(::getpid(), "RssFile");
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
