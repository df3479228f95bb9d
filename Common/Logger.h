#pragma once

#include <string>
#include <string_view>

#include <Poco/Error.h>
#include <Poco/Exception.h>

#include "Common/LogText.h"
#include "Plugin/ILogger.h"
#include "Plugin/ModuleLoader.h"

// The logger of a source file, and the only way to write a log line. Every function here that uses pSysLog is
// static, so that each source file has its own copy. An inline function would be shared: all source files
// would use the logger of one of them.

/// Loads the logger plug-in. Each source file that logs has its own loader and its own logger. Only App/main
/// configures its logger. All loggers of the process then write into that logger's sink.
static SystemTool::ModuleLoader<SystemTool::IO::ILogger>
    g_LoggerLoader(SystemTool::IO::Directory::GetExcutableDirectory() + "libBoostLogger.dylib");

/// Null when the plug-in could not be loaded. Then nothing is logged, and everything else works.
[[maybe_unused]] static SystemTool::IO::ILogger* pSysLog = g_LoggerLoader.GetModule();

namespace SyncServiceReport {

enum class LogLevel : int {
    Info = 2,    ///< What arrived, and what a control message changed.
    Warning = 3, ///< Exceptions that were caught, and reports that no destination takes.
    Error = 4,   ///< Failures, the crash trace, and texts that could not be built.
};

/// Where a record comes from. The source file is the calling one, found by the compiler, as its folder and
/// its name without the extension. The line is fixed where people search for it by number; otherwise it is
/// the calling line.
struct LogSite {
    constexpr LogSite(LogLevel levelOfRecord, const char* functionName, int fixedLine = __builtin_LINE(),
                      std::string_view path = __builtin_FILE())
        : level(levelOfRecord), function(functionName), line(fixedLine), file(FolderAndStem(path)) {}

    LogLevel level;
    const char* function;
    int line;
    std::string_view file; ///< Such as "App/ReportServer".

    static constexpr std::string_view FolderAndStem(std::string_view path) {
        const auto name = path.rfind('/');
        // Without a folder, npos + 1 is the start of the text.
        const auto folder = path.rfind('/', name - 1) + 1;
        return path.substr(folder, path.rfind('.') - folder);
    }
};

/// Writes one log line. `format` may be a text from outside; that is required behaviour. When boost::format
/// cannot use a percent sign in it, an Error line with "[BoostLogError]" and the reason takes the text's
/// place. People search the log for that mark to find datagrams with percent signs.
///
/// Never throws, also when the logger throws or when that Error line cannot be written: a report must not be
/// lost because of a log line. False when such an Error line took the text's place.
template <typename... Arguments>
static bool WriteLog(const LogSite& site, const std::string& format, const Arguments&... arguments) noexcept {
    if (pSysLog == nullptr)
        return true;
    const auto write = [&site](LogLevel level, const std::string& text) {
        pSysLog->WriteLog(static_cast<int>(level), "", std::string(site.file), site.function, site.line, text,
                          0);
    };
    try {
        try {
            if (sizeof...(arguments) == 0 && IsOwnText(format))
                write(site.level, format);
            else
                write(site.level, BuildLogText(format, arguments...));
        } catch (const std::exception& error) {
            write(LogLevel::Error, std::string("[BoostLogError]") + error.what());
            return false;
        }
    } catch (...) { // the logger itself fails, so there is nowhere left to log that
    }
    return true;
}

/// Logs the current exception. Throws when there is no memory for its text.
[[maybe_unused]] static void LogExceptionUnderWay(const LogSite& site) {
    try {
        throw;
    } catch (const Poco::Exception& error) {
        WriteLog(site, "Poco exception :%s ", error.displayText());
    } catch (const std::exception& error) {
        WriteLog(site, "Std exception :%s ", error.what());
    } catch (...) {
        const int code = Poco::Error::last();
        WriteLog(site, "Unknown exception :%d-%s", code, Poco::Error::getMessage(code));
    }
}

/// For the last handler of a public operation: `catch (...) { return LogCaughtException(site); }`. Logs the
/// current exception in the words that people search the log for, their trailing blanks included. Always
/// false, which is the result of an operation that caught an exception. When there is no memory for the text,
/// it logs that second exception instead. When there is no memory for that either, it logs nothing.
[[maybe_unused]] static bool LogCaughtException(const LogSite& site) noexcept {
    try {
        LogExceptionUnderWay(site);
    } catch (...) {
        try {
            LogExceptionUnderWay(site);
        } catch (...) { // no memory is left for any line
        }
    }
    return false;
}

} // namespace SyncServiceReport
