#include "tests/fakes/FakeSdk.h"

namespace {

FakeSdkState& State() {
    static FakeSdkState state;
    return state;
}

#ifdef INIT_THROWS_OWN_CLASS
/// A class that only this library has. Its code is gone when the library is closed.
class OwnError : public std::exception {
public:
    const char* what() const noexcept override { return "the SDK's own error"; }
};
#endif

class Sdk final : public IMetrikSdk {
public:
    explicit Sdk(int number) : m_number(number) {}

    std::string GetSdkVersion() override {
        State().calls.push_back({0, m_number, {}});
        return "fake";
    }
    std::int64_t GetPendingCount() override {
        State().calls.push_back({1, m_number, {}});
        return 0;
    }
    bool InitSdk(std::string moduleId, std::string moduleVersion, std::string moduleName, std::string logDir,
                 std::string dbDir, Callback onFailure, Callback onSuccess) override {
        State().calls.push_back({2, m_number, {moduleId, moduleVersion, moduleName, logDir, dbDir}});
        State().onFailure = onFailure;
        State().onSuccess = onSuccess;
#ifdef INIT_THROWS_OWN_CLASS
        throw OwnError();
#endif
        ThrowIf(State().initThrows);
        return State().initAnswer;
    }
    bool ReportEvent(std::string eventId, std::string eventJson) override {
        State().calls.push_back({3, m_number, {eventId, eventJson}});
        ThrowIf(State().reportThrows);
        return State().reportAnswer;
    }

private:
    int m_number;
};

} // namespace

FAKE_EXPORT FakeSdkState* FakeState() {
    return &State();
}

FAKE_EXPORT IMetrikSdk* CreateModule() {
    return State().Create() ? new Sdk(State().created) : nullptr;
}

FAKE_EXPORT void DestoryModule(IMetrikSdk* sdk) {
    State().Destroy();
    delete static_cast<Sdk*>(sdk);
}
