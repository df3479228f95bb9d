#pragma once

#include <string>

namespace reportctl::terminal {

/// The path as one word of a shell command, in single quotes when it needs them.
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
