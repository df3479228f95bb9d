#pragma once

#include <string>
#include <string_view>

#include <Poco/Error.h>
#include <Poco/Exception.h>

#include "Common/LogText.h"
#include "Plugin/ILogger.h"
#include "Plugin/ModuleLoader.h"

// The logger of a source file, and the one way to write a log line. Everything here that names pSysLog is
// static, so that each source file has its own: a shared inline function would mean another file's logger in
// every file.

/// Loads the logger plug-in; each source file that logs has its own loader. Only the one of App/main is
/// configured; all of them write into the sink which that configures.
static SystemTool::ModuleLoader<SystemTool::IO::ILogger>
    g_LoggerLoader(SystemTool::IO::Directory::GetExcutableDirectory() + "libBoostLogger.dylib");

/// Null when the plug-in could not be loaded; then nothing is logged and everything else goes on.
[[maybe_unused]] static SystemTool::IO::ILogger* pSysLog = g_LoggerLoader.GetModule();

namespace SyncServiceReport {

enum class LogLevel : int {
    Info = 2,    ///< What arrived, and what was done on a control message.
    Warning = 3, ///< Exceptions that were caught, and reports that no destination takes.
    Error = 4,   ///< Failures, the crash trace, and texts that could not be built.
};

/// Where a record comes from. The source file is the calling one by itself, as its folder and stem. The line
/// is fixed where people look for it by number, else the site's own.
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
        const auto folder = path.rfind('/', name - 1) + 1; // without one, npos + 1 is the start of the text
        return path.substr(folder, path.rfind('.') - folder);
    }
};

/// Writes one log line. `format` may be a text from outside; that is required behaviour: a percent sign in
/// it, where boost::format cannot make sense of it, gives an Error line of "[BoostLogError]" and the reason
/// instead. People search the log for that mark to find datagrams with percent signs.
///
/// Never throws, also when the logger throws or the report of a failed write fails: a log line is not worth
/// a report. False when such an Error line took the text's place.
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
    } catch (...) { // the logger itself is failing: no place is left to report it
    }
    return true;
}

/// Logs the exception under way. Throws when there is no memory for its text.
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

/// For the last handler of a public operation, `catch (...) { return LogCaughtException(site); }`: logs the
/// exception under way in the words that people search the log for, their trailing blanks included. Always
/// false, the result of an operation that caught one. Where its text cannot be built, the reason for that is
/// logged instead; without memory for that, nothing is.
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
