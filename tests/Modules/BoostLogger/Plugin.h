#pragma once

#include <string>

#include "Plugin/ILogger.h"
#include "Plugin/ModuleLoader.h"

using LoggerLoader = SystemTool::ModuleLoader<SystemTool::IO::ILogger>;

/// The arguments of InitLog. The defaults are for tests to which the value does not matter.
struct LogArguments {
    std::string directory;
    std::int64_t maxFileBytes = 10 * 1024 * 1024;
    std::int64_t maxTotalBytes = 100 * 1024 * 1024;
    int console = 0;
    std::string fileName = "Report.log";
};

inline void Init(LoggerLoader& loader, const LogArguments& arguments) {
    loader.GetModule()->InitLog(arguments.directory, arguments.fileName, "TEST", "APP",
                                arguments.maxFileBytes, arguments.maxTotalBytes, 1, arguments.console);
}

inline void Log(SystemTool::IO::ILogger* logger, const std::string& message, int level = 2) {
    logger->WriteLog(level, "", "App/ReportServer", "Recv", 42, message, 0);
}

inline void Log(LoggerLoader& loader, const std::string& message, int level = 2) {
    Log(loader.GetModule(), message, level);
}

/// The message of a line: the text after the site.
inline std::string MessageOf(const std::string& line) {
    const std::string site = "[App/ReportServer:42 Recv] ";
    const auto at = line.find(site);
    return at == std::string::npos ? "no record: " + line : line.substr(at + site.size());
}
