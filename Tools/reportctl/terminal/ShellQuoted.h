#pragma once

#include <string>

namespace reportctl::terminal {

/// The path as a shell takes it.
inline std::string ShellQuoted(const std::string& path) {
    if (path.find_first_not_of("/._-0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz") ==
        std::string::npos)
        return path;
    std::string quoted = "'";
    for (const char c : path)
        quoted += c == '\'' ? "'\\''" : std::string(1, c);
    return quoted + "'";
}

} // namespace reportctl::terminal
