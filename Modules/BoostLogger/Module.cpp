// The plug-in libBoostLogger.dylib: the ILogger that its two exported functions hand out, and the one sink of
// the process.

#include <atomic>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <mutex>
#include <string>

#include <boost/exception/info.hpp>

#include "Modules/BoostLogger/LogSink.h"
#include "Plugin/ILogger.h"
#include "SystemTool/BSException.h"

namespace BoostLogger {

namespace {

using SystemTool::BSErrorText;
using SystemTool::BSException;

/// Null until the first InitLog; then the sink, for the rest of the process. A sink that could not open its
/// log is set, too, and opens the log as soon as that works. Another InitLog replaces such a sink.
std::atomic<LogSink*> g_sink = nullptr;

std::mutex g_configuring;                ///< Guards g_settings, and lets one InitLog run at a time.
const LogSettings* g_settings = nullptr; ///< The settings of the InitLog that did not throw; null before.

[[noreturn]] void Refuse(const LogSettings& settings, const std::string& reason,
                         const std::string& systemText) {
    throw BSException(settings.application + " " + settings.module + " has no log: " + reason)
        << BSErrorText(systemText);
}

void CheckSettings(const LogSettings& settings) {
    if (settings.directory.empty())
        Refuse(settings, "the log directory's name is empty.", "");
    if (settings.fileName.empty() || settings.fileName.find('/') != std::string::npos ||
        settings.fileName == "." || settings.fileName == ".." ||
        settings.LivePath().find('\0') != std::string::npos)
        Refuse(settings, "\"" + settings.fileName + "\" is no name of a file.", "");
    if (settings.maxFileBytes <= 0 || settings.maxTotalBytes < settings.maxFileBytes)
        Refuse(settings, "one file must be allowed a byte at least, and all files together as much as one.",
               "");
}

/// Runs in exit, and so also when a crash handler calls exit.
void FinishSink() {
    if (LogSink* sink = g_sink.load(std::memory_order_acquire))
        sink->Finish();
}

/// The sink is leaked on purpose, see LogSink.
void StartSink(const LogSettings& settings) {
    [[maybe_unused]] static const int registered = std::atexit(FinishSink);
    auto sink = std::make_unique<LogSink>(settings);
    const FileFailure failure = sink->Start();
    if (LogSink* failed = g_sink.exchange(sink.release(), std::memory_order_acq_rel))
        failed->Retire();
    if (failure)
        Refuse(settings,
               failure.Text() + ", " + settings.LivePath() +
                   ". Make sure that this user may write there and that the disk is not full; the log begins "
                   "then.",
               failure.Text());
    g_settings = new LogSettings(settings);
}

/// InitLog with the same settings again is no error: the caller asks for the log that is open already.
void Configure(const LogSettings& settings) {
    CheckSettings(settings);
    const std::lock_guard lock(g_configuring);
    if (g_settings == nullptr)
        return StartSink(settings);
    if (!(*g_settings == settings))
        Refuse(settings, "this process logs to " + g_settings->LivePath() + " already, with other settings.",
               "");
}

class Logger final : public SystemTool::IO::ILogger {
public:
    void InitLog(const std::string& logDir, const std::string& fileName, const std::string& appName,
                 const std::string& moduleName, std::int64_t maxFileBytes, std::int64_t maxTotalBytes,
                 int flushEach, int console) override {
        std::error_code none;
        const std::string directory =
            logDir.empty() ? logDir : std::filesystem::absolute(logDir, none).string();
        Configure({directory, fileName, appName, moduleName, maxFileBytes, maxTotalBytes, flushEach != 0,
                   console != 0});
    }

    void WriteLog(int level, const std::string& tag, const std::string& file, const std::string& function,
                  int line, const std::string& message, int /*reserved*/) override {
        if (LogSink* sink = g_sink.load(std::memory_order_acquire))
            sink->Write({level, tag, file, function, line, message});
    }
};

/// The object that every loader gets. It has no state, so one object serves all loaders. It is never
/// destroyed, because exit() destroys the loaders while other threads still call it.
Logger& TheLogger() {
    static Logger* const logger = new Logger;
    return *logger;
}

} // namespace

} // namespace BoostLogger

extern "C" __attribute__((visibility("default"))) SystemTool::IO::ILogger* CreateModule() {
    return &BoostLogger::TheLogger();
}

extern "C" __attribute__((visibility("default"))) void DestoryModule(SystemTool::IO::ILogger*) {}
