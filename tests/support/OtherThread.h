#pragma once

#include <atomic>
#include <fstream>
#include <string>
#include <thread>

#include <unistd.h>

#include "tests/support/WaitUntil.h"

/// Whether the thread sleeps. It does while it waits for a lock, for another thread or for time.
inline bool IsAsleep(pid_t thread) {
    std::ifstream file("/proc/self/task/" + std::to_string(thread) + "/stat");
    std::string fields;
    std::getline(file, fields);
    const auto endOfName = fields.rfind(')'); // a name may contain any character
    return endOfName != std::string::npos && fields.compare(endOfName, 3, ") S") == 0;
}

/// Whether the thread falls asleep and stays asleep for some time. False when `hasEnded` becomes true first.
template <typename HasEnded>
bool FallsAsleep(const std::atomic<pid_t>& thread, HasEnded hasEnded) {
    constexpr int LOOKS = 20; // a millisecond apart
    int asleep = 0;
    return WaitUntil([&] {
               asleep = thread != 0 && IsAsleep(thread) ? asleep + 1 : 0;
               return hasEnded() || asleep == LOOKS;
           }) &&
           !hasEnded();
}

/// Runs a call on a thread of its own. The destructor waits for the call's end.
class OtherThread {
public:
    template <typename Call>
    explicit OtherThread(Call call)
        : m_thread([this, call] {
              m_id = ::gettid();
              call();
              m_ended = true;
          }) {}
    ~OtherThread() { m_thread.join(); }
    OtherThread(const OtherThread&) = delete;
    OtherThread& operator=(const OtherThread&) = delete;

    /// True when the call waits, for example for the thread that asks this. False when the call has ended.
    bool Waits() {
        return FallsAsleep(m_id, [this] { return m_ended.load(); });
    }

private:
    std::atomic<pid_t> m_id = 0;
    std::atomic<bool> m_ended = false;
    std::thread m_thread; ///< The last member, because the thread uses the others.
};
