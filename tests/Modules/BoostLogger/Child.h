#pragma once

#include <csignal>
#include <cstdio>
#include <exception>
#include <string>

#include <sys/wait.h>
#include <unistd.h>

/// Rights do not bind root: a scenario about rights runs as another user then, to whom `directory` is given.
inline bool BecomeOrdinaryUser(const std::string& directory) {
    constexpr uid_t NOBODY = 65534;
    if (geteuid() != 0)
        return true;
    return chown(directory.c_str(), NOBODY, NOBODY) == 0 && setgid(NOBODY) == 0 && setuid(NOBODY) == 0;
}

/// A scenario in a process of its own. It ends without running exit handlers, unless it calls exit itself.
class Child {
public:
    /// `scenario` returns whether all went as it should.
    template <typename Scenario>
    explicit Child(Scenario scenario) : m_pid(fork()) {
        if (m_pid != 0)
            return;
        try {
            _exit(scenario() ? 0 : 1);
        } catch (const std::exception& error) {
            std::fprintf(stderr, "the child threw: %s\n", error.what());
            _exit(2);
        }
    }

    ~Child() {
        if (m_pid <= 0)
            return;
        kill(m_pid, SIGKILL);
        Wait();
    }
    Child(const Child&) = delete;
    Child& operator=(const Child&) = delete;

    pid_t Pid() const { return m_pid; }

    /// The exit status; 128 and the signal's number for a child that a signal ended.
    int Wait() {
        int status = 0;
        waitpid(m_pid, &status, 0);
        m_pid = -1;
        return StatusOf(status);
    }

    /// Whether the child has ended; its status is in Status then.
    bool HasEnded() {
        int status = 0;
        if (m_pid > 0 && waitpid(m_pid, &status, WNOHANG) == m_pid) {
            m_pid = -1;
            m_status = StatusOf(status);
        }
        return m_pid <= 0;
    }

    int Status() const { return m_status; }

private:
    static int StatusOf(int status) {
        return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    }

    pid_t m_pid;
    int m_status = -1;
};
