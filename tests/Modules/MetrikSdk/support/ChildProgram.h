#pragma once

#include <chrono>
#include <optional>
#include <string>

#include <sys/types.h>

/// The program of Child.cpp as a process. The destructor kills it.
class ChildProgram {
public:
    ChildProgram(const std::string& directory, int firstNumber, const std::string& way);
    ~ChildProgram();
    ChildProgram(const ChildProgram&) = delete;
    ChildProgram& operator=(const ChildProgram&) = delete;

    /// Blocks until the child has written something or has ended.
    void AwaitOutput();

    void Kill();

    /// Everything that the child has written. To be called after its end.
    std::string Output();

    /// The child's status as waitpid gives it; nothing when the child does not end in time.
    std::optional<int> AwaitEnd(std::chrono::milliseconds deadline = std::chrono::seconds(20));

private:
    pid_t m_process = -1;
    int m_output = -1;
    std::optional<int> m_status;
};
