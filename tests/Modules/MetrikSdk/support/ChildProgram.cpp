#include "tests/Modules/MetrikSdk/support/ChildProgram.h"

#include <array>
#include <csignal>
#include <cstdlib>
#include <stdexcept>

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include "SystemTool/IO/Directory.h"
#include "tests/support/WaitUntil.h"

namespace {

void AddToVariable(const char* name, const std::string& more) {
    const char* value = ::getenv(name);
    ::setenv(name, (std::string(value == nullptr ? "" : value) + ":" + more).c_str(), 1);
}

/// The service's crash handler makes unsafe calls and ends the process while other threads work, on purpose.
/// The sanitizers must not report that, nor look for leaks then.
void RelaxSanitizers() {
    AddToVariable("TSAN_OPTIONS", "report_signal_unsafe=0");
    AddToVariable("ASAN_OPTIONS", "detect_leaks=0");
}

} // namespace

ChildProgram::ChildProgram(const std::string& directory, int firstNumber, const std::string& way) {
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0)
        throw std::runtime_error("no pipe");
    // Makes the pipe large enough for all that the child writes before the test reads: the child must be
    // killed while it works, not while it waits for the test.
    ::fcntl(ends[1], F_SETPIPE_SZ, 1 << 20);
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_adddup2(&actions, ends[1], STDOUT_FILENO);
    auto program = SystemTool::IO::Directory::GetExcutableDirectory() + "metrik_outbox_child";
    auto path = directory;
    auto number = std::to_string(firstNumber);
    auto how = way;
    std::array<char*, 5> arguments{program.data(), path.data(), number.data(), how.data(), nullptr};
    RelaxSanitizers();
    const int error =
        ::posix_spawn(&m_process, program.c_str(), &actions, nullptr, arguments.data(), environ);
    ::posix_spawn_file_actions_destroy(&actions);
    ::close(ends[1]);
    m_output = ends[0];
    if (error != 0)
        throw std::runtime_error("cannot start " + program);
}

ChildProgram::~ChildProgram() {
    if (!m_status) {
        Kill();
        ::waitpid(m_process, nullptr, 0);
    }
    ::close(m_output);
}

void ChildProgram::AwaitOutput() {
    pollfd output{m_output, POLLIN, 0};
    ::poll(&output, 1, -1);
}

void ChildProgram::Kill() {
    ::kill(m_process, SIGKILL);
}

std::string ChildProgram::Output() {
    std::string text;
    std::array<char, 65536> bytes{};
    for (ssize_t count = 0; (count = ::read(m_output, bytes.data(), bytes.size())) > 0;)
        text.append(bytes.data(), static_cast<std::size_t>(count));
    return text;
}

std::optional<int> ChildProgram::AwaitEnd(std::chrono::milliseconds deadline) {
    int status = 0;
    if (WaitUntil([&] { return ::waitpid(m_process, &status, WNOHANG) == m_process; }, deadline))
        m_status = status;
    return m_status;
}
