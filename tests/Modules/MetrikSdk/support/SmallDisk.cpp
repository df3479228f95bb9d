#include "tests/Modules/MetrikSdk/support/SmallDisk.h"

#include <cstdio>
#include <fstream>

#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "tests/support/ChildProcess.h"

namespace {

constexpr int PASSED = 0;
constexpr int FAILED = 1;
constexpr int UNAVAILABLE = 77;

bool EnterOwnMountNamespace() {
    const auto user = ::getuid();
    const auto group = ::getgid();
    if (user == 0)
        return ::unshare(CLONE_NEWNS) == 0;
    if (::unshare(CLONE_NEWUSER | CLONE_NEWNS) != 0)
        return false;
    // Both ids need a mapping: a file system refuses files whose user or group has none.
    std::ofstream("/proc/self/setgroups") << "deny";
    std::ofstream("/proc/self/uid_map") << "0 " << user << " 1";
    std::ofstream("/proc/self/gid_map") << "0 " << group << " 1";
    return true;
}

int RunChild(const std::string& directory, int bytes, const std::function<void()>& test) {
    if (!EnterOwnMountNamespace() || ::mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0 ||
        ::mount("tmpfs", directory.c_str(), "tmpfs", 0, ("mode=700,size=" + std::to_string(bytes)).c_str()) !=
            0)
        return UNAVAILABLE;
    test();
    return testing::Test::HasFailure() ? FAILED : PASSED;
}

} // namespace

SmallDiskResult RunOnSmallDisk(const std::string& directory, int bytes, const std::function<void()>& test) {
    const int code = ChildProcess([&] {
                         const int result = RunChild(directory, bytes, test);
                         std::fflush(nullptr);
                         return result;
                     }).Wait();
    if (code == UNAVAILABLE)
        return SmallDiskResult::Unavailable;
    return code == PASSED ? SmallDiskResult::Passed : SmallDiskResult::Failed;
}
