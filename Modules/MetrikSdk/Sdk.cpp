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
    std::string refusal;
    m_engine = m_registry.Acquire(dbDir, refusal);
    TellDirectory(refusal);
    if (!m_engine)
        return false;
    m_engine->Listeners().Subscribe(m_onFailure, m_onSuccess);
    if (!m_engine->Open() && !MovesToTheFirst())
        return false;
    Call(m_onSuccess, "init", m_module.id);
    return true;
}

/// What became of the directory that the module gave, when it is not used.
void Sdk::TellDirectory(const std::string& refusal) {
    if (m_engine && refusal.empty())
        return;
    const auto text = refusal.empty()
                          ? m_registry.ReportNoDirectory()
                          : m_registry.Report(report::Cause::Directory,
                                              refusal + (m_engine ? "; the module uses the first outbox"
                                                                  : "; events of this module are refused"));
    if (text)
        Call(m_onFailure, NameOf(report::Cause::Directory), *text);
}

/// Leaves an outbox whose directory turned unsafe after it was announced for the first outbox. Whether it did.
bool Sdk::MovesToTheFirst() {
    if (!m_engine || !m_engine->Events().IsUnsafe())
        return false;
    auto first = m_registry.Acquire({});
    const bool isAnother = first && first != m_engine;
    if (isAnother) {
        Detach();
        m_engine = std::move(first);
        m_engine->Listeners().Subscribe(m_onFailure, m_onSuccess);
    } else {
        m_registry.Release(first);
    }
    return isAnother && m_engine->Open();
}

void Sdk::Detach() {
    if (!m_engine)
        return;
    m_engine->Listeners().Unsubscribe(m_onFailure, m_onSuccess);
    m_registry.Release(m_engine);
}

bool Sdk::ReportEvent(std::string eventId, std::string eventJson) {
    try {
        const auto store = [&] {
            return m_engine && m_engine->Events().Append(m_module, eventId, eventJson);
        };
        return store() || (MovesToTheFirst() && store());
    } catch (const std::exception&) { // out of memory: nothing was stored, and there is none to tell it with
        return false;
    }
}

} // namespace MetrikSdk
