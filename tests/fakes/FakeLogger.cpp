#include "tests/fakes/FakeLogger.h"

#include <cstdlib>

#include "Plugin/ILogger.h"
#include "SystemTool/BSException.h"

namespace {

FakeLoggerState& State() {
    static auto* state = [] {
        // Never destroyed, because the program's statics log while they are destroyed.
        auto* made = new FakeLoggerState;
        made->echoes = std::getenv("FAKE_LOGGER_ECHOES") != nullptr;
        return made;
    }();
    return *state;
}

class Logger final : public SystemTool::IO::ILogger {
public:
    void InitLog(const std::string& logDir, const std::string& fileName, const std::string& appName,
                 const std::string& moduleName, std::int64_t maxFileBytes, std::int64_t maxTotalBytes,
                 int flushEach, int console) override {
        if (std::getenv("FAKE_LOGGER_REFUSES") != nullptr)
            throw SystemTool::BSException("no log") << SystemTool::BSErrorText("disk full");
        if (std::getenv("FAKE_LOGGER_BREAKS") != nullptr)
            throw std::runtime_error("of a kind that no caller expects");
        if (State().echoes)
            std::cerr << "InitLog " << logDir << ' ' << fileName << ' ' << appName << ' ' << moduleName << ' '
                      << maxFileBytes << ' ' << maxTotalBytes << ' ' << flushEach << ' ' << console
                      << std::endl;
    }

    void WriteLog(int level, const std::string& tag, const std::string& file, const std::string& function,
                  int line, const std::string& message, int reserved) override {
        State().Write({level, file, function, line, message, tag, reserved}, this);
    }
};

} // namespace

FAKE_EXPORT FakeLoggerState* FakeState() {
    return &State();
}

FAKE_EXPORT SystemTool::IO::ILogger* CreateModule() {
    ++State().created;
    return new Logger;
}

FAKE_EXPORT void DestoryModule(SystemTool::IO::ILogger* logger) {
    delete static_cast<Logger*>(logger);
}
