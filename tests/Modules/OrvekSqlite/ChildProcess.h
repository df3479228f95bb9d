#pragma once

#include <chrono>
#include <csignal>
#include <functional>
#include <optional>

#include <sys/wait.h>
#include <unistd.h>

#include "tests/support/WaitUntil.h"

/// A second process that runs a function of the test. Started before this process opens the database: SQLite
/// does not survive a fork.
class ChildProcess {
public:
    /// Runs `body` in the child, which ends with the status that it returns. The body gets a function that
    /// tells the parent, once, that the child is where the parent waits for it.
    explicit ChildProcess(const std::function<int(const std::function<void()>&)>& body) {
        int ends[2] = {-1, -1};
        if (::pipe(ends) != 0)
            return;
        m_id = ::fork();
        if (m_id == 0)
            ::_exit(body([&] { (void)!::write(ends[1], "!", 1); }));
        ::close(ends[1]);
        m_signal = ends[0];
    }

    ~ChildProcess() {
        if (m_id > 0) {
            ::kill(m_id, SIGKILL);
            Wait();
        }
        ::close(m_signal);
    }

    ChildProcess(const ChildProcess&) = delete;
    ChildProcess& operator=(const ChildProcess&) = delete;

    /// Blocks until the child told; false when it ended before.
    bool WaitUntilItTold() {
        char mark = 0;
        return ::read(m_signal, &mark, 1) == 1;
    }

    /// Ends the child as kill -9 does; its wait status.
    int Kill() {
        ::kill(m_id, SIGKILL);
        return Wait();
    }

    /// The child's wait status, if it ends before the deadline.
    std::optional<int> WaitFor(std::chrono::milliseconds deadline) {
        int status = -1;
        if (!WaitUntil([&] { return ::waitpid(m_id, &status, WNOHANG) == m_id; }, deadline))
            return std::nullopt;
        m_id = -1;
        return status;
    }

    /// The child's wait status.
    int Wait() {
        int status = -1;
        ::waitpid(m_id, &status, 0);
        m_id = -1;
        return status;
    }

private:
    pid_t m_id = -1;
    int m_signal = -1;
};
