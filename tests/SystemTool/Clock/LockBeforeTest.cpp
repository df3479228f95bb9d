#include "SystemTool/Clock/LockBefore.h"

#include <future>

#include <gtest/gtest.h>

#include "tests/support/OtherThread.h"

namespace {

using std::chrono::steady_clock;
using SystemTool::Clock::LockBefore;
using namespace std::chrono_literals;

TEST(LockBefore, TakesAFreeMutexAlsoWhenTheDeadlineIsOver) {
    std::mutex mutex;
    EXPECT_TRUE(LockBefore(mutex, steady_clock::now() - 1s).owns_lock());
}

TEST(LockBefore, TakesAMutexThatIsReleasedInTime) {
    std::mutex mutex;
    bool isLocked = false;
    {
        std::unique_lock kept(mutex);
        OtherThread other([&] { isLocked = LockBefore(mutex, steady_clock::now() + 60s).owns_lock(); });
        EXPECT_TRUE(other.Waits());
        kept.unlock();
    }
    EXPECT_TRUE(isLocked);
}

TEST(LockBefore, GivesUpAtTheDeadlineWhileAnotherThreadKeepsTheMutex) {
    std::mutex mutex;
    const std::lock_guard kept(mutex);
    const auto deadline = steady_clock::now() + 20ms;
    const bool isLocked =
        std::async(std::launch::async, [&] { return LockBefore(mutex, deadline).owns_lock(); }).get();
    EXPECT_FALSE(isLocked);
    EXPECT_GE(steady_clock::now(), deadline);
}

} // namespace
