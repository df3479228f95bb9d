#pragma once

#include <atomic>
#include <fstream>
#include <string>
#include <thread>

#include <unistd.h>

#include "tests/support/WaitUntil.h"

/// Whether the kernel has put the thread to sleep, as it does while the thread waits for a lock, another
/// thread or time.
inline bool IsAsleep(pid_t thread) {
    std::ifstream file("/proc/self/task/" + std::to_string(thread) + "/stat");
    std::string fields;
    std::getline(file, fields);
    const auto endOfName = fields.rfind(')'); // a name may hold anything
    return endOfName != std::string::npos && fields.compare(endOfName, 3, ") S") == 0;
}

/// Whether the thread falls asleep and stays so, rather than for a moment. False when `hasEnded` comes first.
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

/// A call on a thread of its own; the destructor waits for its end.
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

    /// False when the call ended; true when it waits, for the caller of this for one.
    bool Waits() {
        return FallsAsleep(m_id, [this] { return m_ended.load(); });
    }

private:
    std::atomic<pid_t> m_id = 0;
    std::atomic<bool> m_ended = false;
    std::thread m_thread; ///< The last member: it uses the others.
};
