#pragma once

#include <fstream>
#include <string>

#include <sys/types.h>

/// What the kernel says of a process under this name in /proc/PID/status, such as "0000" for "Umask". Empty
/// when it says nothing.
inline std::string StatusOf(pid_t process, const std::string& name) {
    std::ifstream status("/proc/" + std::to_string(process) + "/status");
    for (std::string line; std::getline(status, line);)
        if (line.starts_with(name + ":\t"))
            return line.substr(name.size() + 2);
    return {};
}

/// The same as a number, such as the kilobytes of "VmRSS"; -1 when the kernel says nothing.
inline long NumberInStatusOf(pid_t process, const std::string& name) {
    const auto text = StatusOf(process, name);
    return text.empty() ? -1 : std::stol(text);
}
