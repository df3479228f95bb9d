#include "tests/fakes/FakeLogger.h"

#include "Plugin/ILogger.h"

namespace {

FakeLoggerState& State() {
    static auto* state = new FakeLoggerState; // outlives the statics of the program, which log while they go
    return *state;
}

class Logger final : public SystemTool::IO::ILogger {
public:
    void InitLog(const std::string&, const std::string&, const std::string&, const std::string&, std::int64_t,
                 std::int64_t, int, int) override {}

    void WriteLog(int level, const std::string& tag, const std::string& file, const std::string& function,
                  int line, const std::string& message, int reserved) override {
        State().Write({level, file, function, line, message, tag, reserved});
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
