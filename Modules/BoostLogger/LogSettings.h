#pragma once

#include <cstdint>
#include <string>

namespace BoostLogger {

/// The arguments of InitLog.
struct LogSettings {
    std::string directory; ///< Absolute, so that a later chdir of the program does not move the log.
    std::string fileName;  ///< The name of the live file; the rotated files are named after it.

    /// These two are named in the error text when the log cannot be opened. They are not in the records,
    /// because a log directory belongs to one program.
    std::string application;
    std::string module;

    /// An editor opens a file of this size at once.
    std::int64_t maxFileBytes = std::int64_t{10} * 1024 * 1024;
    std::int64_t maxTotalBytes = std::int64_t{100} * 1024 * 1024; ///< Live and rotated files together.

    /// False allows the logger to keep records back. The logger does the same with true and with false: in a
    /// burst, it keeps a record for a millisecond at most (see WaitingLines). Keeping records for longer
    /// would save hardly any time.
    bool flushEach = true;
    bool console = false;

    bool operator==(const LogSettings&) const = default;

    std::string LivePath() const { return directory + "/" + fileName; }
};

} // namespace BoostLogger
