#pragma once

#include <string>

namespace BoostLogger {

/// Says which step on the log's files failed, and the system's reason. A default object means that nothing
/// failed. It is small and allocates nothing, because it is passed around while the log is locked.
struct FileFailure {
    int error = 0;         ///< An errno.
    const char* step = ""; ///< What could not be done, as in "cannot <step>".

    explicit operator bool() const { return error != 0; }

    /// The text for a person, such as "cannot open the file: Permission denied".
    std::string Text() const;
};

} // namespace BoostLogger
