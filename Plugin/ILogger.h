#pragma once

#include <cstdint>
#include <string>

namespace SystemTool::IO {

/// The logger that the plug-in libBoostLogger.dylib implements.
///
/// Ownership: objects are made and destroyed by their plug-in alone ("CreateModule", "DestoryModule").
/// Threads: WriteLog from any thread; InitLog once, before the threads that log are started.
class ILogger {
public:
    /// Configures the one sink of the process; every instance, this one and all others, writes into it from
    /// then on. Until then nothing is written anywhere.
    ///
    /// Makes `logDir` where it is missing and opens `fileName` in it for appending. The file is rotated at
    /// `maxFileBytes`; the oldest rotated files are deleted so that all of them with the live one stay within
    /// `maxTotalBytes`. `flushEach` other than 0: a record is in the file when WriteLog returns. `console`
    /// other than 0: records are copied to standard output.
    ///
    /// Throws SystemTool::BSException when the directory or the file cannot be used. Records are lost then,
    /// and the log begins, with their number, as soon as it can be written.
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
