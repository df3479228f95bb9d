#pragma once

#include <string>

namespace BoostLogger {

/// Which step on the log's files failed, and the system's reason. Default: nothing failed. Small and without
/// allocation, because it is passed around while the log is locked.
struct FileFailure {
    int error = 0;         ///< An errno.
    const char* step = ""; ///< What could not be done, as in "cannot <step>".

    explicit operator bool() const { return error != 0; }

    /// Such as "cannot open the file: Permission denied".
    std::string Text() const;
};

} // namespace BoostLogger
