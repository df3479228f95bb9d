#include "Modules/MetrikSdk/Sdk.h"

#include <utility>

#include "Modules/MetrikSdk/Version.h"
#include "Modules/MetrikSdk/outbox/StoreError.h"
#include "SystemTool/Text/Utf8.h"

namespace MetrikSdk {
namespace {

/// A module's texts come from datagrams of 10 KiB, and every module's stay in memory. Longer ones are cut; no
/// honest module has one.
constexpr std::size_t MAX_IDENTITY_BYTES = 256;

std::string Cut(const std::string& identity) {
    return std::string(SystemTool::Text::CutUtf8(identity, MAX_IDENTITY_BYTES));
}

void Call(IMetrikSdk::Callback callback, const std::string& what, const std::string& detail) {
    try {
        if (callback != nullptr)
            callback(what, detail);
    } catch (...) { // the listener's own problem
    }
}

} // namespace

std::string Sdk::GetSdkVersion() {
    return SDK_VERSION;
}

std::int64_t Sdk::GetPendingCount() {
    try {
        return m_engine ? m_engine->Events().Status().waiting : -1;
    } catch (const std::exception&) { // told already
        return -1;
    }
}

bool Sdk::InitSdk(std::string moduleId, std::string moduleVersion, std::string moduleName,
                  std::string /*logDir*/, std::string dbDir, Callback onFailure, Callback onSuccess) {
    try {
        Detach();
        m_module = {Cut(moduleId), Cut(moduleVersion), Cut(moduleName)};
        m_onFailure = onFailure;
        m_onSuccess = onSuccess;
        return Attach(dbDir);
    } catch (const std::exception& error) {
        TellInitFailure(onFailure, error.what());
        return false;
    }
}

void Sdk::TellInitFailure(Callback onFailure, const char* reason) noexcept {
    try {
        if (const auto text = m_registry.Report(report::Cause::Init, reason))
            Call(onFailure, report::NameOf(report::Cause::Init), *text);
    } catch (...) { // no memory to tell it with
    }
}

bool Sdk::Attach(const std::string& dbDir) {
    m_engine = m_registry.Acquire(dbDir);
    if (!m_engine) {
        if (const auto text = m_registry.ReportNoDirectory())
            Call(m_onFailure, report::NameOf(report::Cause::Directory), *text);
        return false;
    }
    m_engine->Listeners().Subscribe(m_onFailure, m_onSuccess);
    if (!m_engine->Open())
        return false;
    Call(m_onSuccess, "init", m_module.id);
    return true;
}

void Sdk::Detach() {
    if (!m_engine)
        return;
    m_engine->Listeners().Unsubscribe(m_onFailure, m_onSuccess);
    m_registry.Release(m_engine);
}

bool Sdk::ReportEvent(std::string eventId, std::string eventJson) {
    try {
        return m_engine && m_engine->Events().Append(m_module, std::move(eventId), std::move(eventJson));
    } catch (const std::exception&) { // out of memory: nothing was stored, and there is none to tell it with
        return false;
    }
}

} // namespace MetrikSdk
