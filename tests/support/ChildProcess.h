#pragma once

#include <array>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <exception>
#include <functional>
#include <optional>
#include <type_traits>
#include <utility>

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/support/WaitUntil.h"

/// A second process, which runs a function of the test. The destructor kills it.
///
/// Start it before this process opens a database or starts a thread, because neither works after a fork. The
/// child ends without its exit handlers, unless the function itself calls exit.
class ChildProcess {
public:
    /// The child calls it, once, to say that it has reached the point that the parent waits for.
    using Tell = std::function<void()>;

    /// `body` returns the exit code, or a bool that is true for success. It may take a Tell.
    template <typename Body>
    explicit ChildProcess(Body body) {
        std::array<int, 2> ends{-1, -1};
        if (::pipe2(ends.data(), O_CLOEXEC) != 0)
            return;
        m_pid = ::fork();
        if (m_pid == 0)
            ::_exit(CodeOf(body, ends[1]));
        ::close(ends[1]);
        m_told = ends[0];
    }

    ~ChildProcess() {
        if (m_pid > 0)
            Kill();
        ::close(m_told);
    }

    ChildProcess(const ChildProcess&) = delete;
    ChildProcess& operator=(const ChildProcess&) = delete;

    pid_t Pid() const { return m_pid; }

    /// Blocks until the child has called Tell; false when the child ended before.
    bool WaitUntilItTold() {
        char mark = 0;
        return ::read(m_told, &mark, 1) == 1;
    }

    /// Ends the child as kill -9 does. Returns the same as Wait.
    int Kill() {
        ::kill(m_pid, SIGKILL);
        return Wait();
    }

    /// Waits for the child's end. Returns the exit code, or 128 plus the signal's number when a signal ended
    /// it.
    int Wait() {
        int status = 0;
        ::waitpid(m_pid, &status, 0);
        return Ended(status);
    }

    /// The same as Wait, but nothing when the child does not end before the deadline.
    std::optional<int> WaitFor(std::chrono::milliseconds deadline) {
        return WaitUntil([this] { return HasEnded(); }, deadline) ? std::optional(m_code) : std::nullopt;
    }

    /// Whether the child has ended. If so, Status returns what Wait would return.
    bool HasEnded() {
        int status = 0;
        if (m_pid > 0 && ::waitpid(m_pid, &status, WNOHANG) == m_pid)
            Ended(status);
        return m_pid <= 0;
    }

    int Status() const { return m_code; }

private:
    static constexpr int THREW = 99;

    template <typename Body>
    static int CodeOf(Body& body, int tell) {
        try {
            if constexpr (std::is_invocable_v<Body&, Tell>)
                return CodeOf(body([tell] { (void)!::write(tell, "!", 1); }));
            else
                return CodeOf(body());
        } catch (const std::exception& error) {
            std::fprintf(stderr, "the child threw: %s\n", error.what());
            return THREW;
        }
    }

    static int CodeOf(bool allIsWell) { return allIsWell ? 0 : 1; }
    static int CodeOf(int code) { return code; }

    int Ended(int status) {
        m_pid = -1;
        m_code = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
        return m_code;
    }

    pid_t m_pid = -1;
    int m_told = -1;
    int m_code = -1;
};
