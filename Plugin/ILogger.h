#pragma once

#include <cstdint>
#include <string>

namespace SystemTool::IO {

/// The logger that the plug-in libBoostLogger.dylib implements.
///
/// Ownership: only the plug-in makes and destroys its objects ("CreateModule", "DestoryModule").
/// Threads: WriteLog from any thread; InitLog once, before the threads that log are started.
class ILogger {
public:
    /// Configures the one sink of the process. From then on, every logger object of the process writes into
    /// it. Until then, nothing is written anywhere.
    ///
    /// Makes `logDir` when it is missing, and opens `fileName` in it for appending. The file is rotated at
    /// `maxFileBytes`. The oldest rotated files are deleted, so that the live file and all rotated ones
    /// together stay within `maxTotalBytes`. When `flushEach` is not 0, a record is in the file when WriteLog
    /// returns; in a burst, a millisecond later at most. When `console` is not 0, records are also copied to
    /// standard output.
    ///
    /// Throws SystemTool::BSException when the directory or the file cannot be used. Records are lost from
    /// then on. As soon as the file can be written, the log begins with a record that says how many were
    /// lost.
    virtual void InitLog(const std::string& logDir, const std::string& fileName, const std::string& appName,
                         const std::string& moduleName, std::int64_t maxFileBytes, std::int64_t maxTotalBytes,
                         int flushEach, int console) = 0;

    /// Writes one record. Levels: 1 debug, 2 information, 3 warning, 4 error, 5 fatal. `tag` is empty and
    /// `reserved` 0 in this program. `file` is the source file without its extension, such as
    /// "App/ReportServer".
    virtual void WriteLog(int level, const std::string& tag, const std::string& file,
                          const std::string& function, int line, const std::string& message,
                          int reserved) = 0;

protected:
    ~ILogger() = default;
};

} // namespace SystemTool::IO
