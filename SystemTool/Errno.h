#pragma once

#include <cerrno>
#include <string>
#include <system_error>

namespace SystemTool {

/// The system's words for an errno, such as "Permission denied".
inline std::string ErrnoText(int code) {
    return std::generic_category().message(code);
}

/// Throws std::system_error. Its text is the system's words alone, for a caller that says itself what failed.
[[noreturn]] inline void ThrowErrno(int code) {
    throw std::system_error(code, std::generic_category());
}

/// Throws std::system_error. Its text is `what` and the system's words, as in "cannot open x: Permission
/// denied".
[[noreturn]] inline void ThrowErrno(const std::string& what, int code = errno) {
    throw std::system_error(code, std::generic_category(), what);
}

} // namespace SystemTool
