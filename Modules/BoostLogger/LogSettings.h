#pragma once

#include <cstdint>
#include <string>

namespace BoostLogger {

/// What InitLog was told.
struct LogSettings {
    std::string directory; ///< Absolute, so that a later chdir of the program does not move the log.
    std::string fileName;  ///< Of the live file; the rotated ones are named after it.
    std::string
        application;    ///< Together with the module: who is named when the log cannot be opened. Not in the
    std::string module; ///< records, since a log directory is one program's.

    std::int64_t maxFileBytes = std::int64_t{10} * 1024 * 1024;   ///< What an editor opens at once.
    std::int64_t maxTotalBytes = std::int64_t{100} * 1024 * 1024; ///< Live and rotated files together.

    /// Allows to keep records back when false. Nothing is kept back all the same: a record is one write to
    /// the file, and keeping them would need a thread that writes them out in time, in a library that lives
    /// until the very end of the process.
    bool flushEach = true;
    bool console = false;

    bool operator==(const LogSettings&) const = default;

    std::string LivePath() const { return directory + "/" + fileName; }
};

} // namespace BoostLogger
