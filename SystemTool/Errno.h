#pragma once

#include <stdexcept>
#include <string>
#include <system_error>

namespace SystemTool {

/// The system's words for an errno, such as "Permission denied".
inline std::string ErrnoText(int code) {
    return std::generic_category().message(code);
}

/// Throws std::runtime_error with the system's words.
[[noreturn]] inline void ThrowErrno(int code) {
    throw std::runtime_error(ErrnoText(code));
}

} // namespace SystemTool
