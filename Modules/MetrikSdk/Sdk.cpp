#include "Modules/MetrikSdk/Sdk.h"

#include <utility>

#include "Modules/MetrikSdk/Version.h"
#include "Modules/MetrikSdk/outbox/StoreError.h"
#include "SystemTool/Text/Utf8.h"

namespace MetrikSdk {
namespace {

/// The most bytes of a module's id. The texts come from datagrams of 10 KiB, and every module's id stays in
/// memory. Longer texts are cut; no honest module has one.
constexpr std::size_t MAX_ID_BYTES = 64;
constexpr std::size_t MAX_TEXT_BYTES = 256; ///< The same for a version or a name.

std::string Cut(const std::string& text, std::size_t maxBytes) {
    return std::string(SystemTool::Text::CutUtf8(text, maxBytes));
}

/// The id as a collector sees it, which gets only valid UTF-8. So two ids that a collector could not tell
/// apart are one module of the outbox, and no sequence number is used twice.
std::string StoredId(const std::string& id) {
    return Cut(SystemTool::Text::ValidUtf8(Cut(id, MAX_ID_BYTES)), MAX_ID_BYTES);
}

void Call(IMetrikSdk::Callback callback, const std::string& what, const std::string& detail) {
    try {
        if (callback != nullptr)
            callback(what, detail);
    } catch (...) { // an exception of the callback is its own problem
    }
}

} // namespace

std::string Sdk::GetSdkVersion() {
    return SDK_VERSION;
}

std::int64_t Sdk::GetPendingCount() {
    try {
        return m_membership ? Events().Status().waiting : -1;
    } catch (const std::exception&) { // not reported here: Open and Append report what is wrong
        return -1;
    }
}

bool Sdk::InitSdk(std::string moduleId, std::string moduleVersion, std::string moduleName,
                  std::string /*logDir*/, std::string dbDir, Callback onFailure, Callback onSuccess) {
    try {
        if (!m_announcement)
            m_announcement = std::make_unique<Announcement>();
        Detach();
        *m_announcement = {true,
                           std::move(moduleId),
                           std::move(dbDir),
                           {nullptr, onFailure, onSuccess, std::move(moduleVersion), std::move(moduleName)}};
        return Attach();
    } catch (const std::exception& error) {
        Tell(report::Cause::Init, error.what());
        return false;
    }
}

void Sdk::Tell(report::Cause cause, const char* reason) noexcept {
    const auto onFailure = m_membership     ? m_membership->onFailure
                           : m_announcement ? m_announcement->module.onFailure
                                            : nullptr;
    try {
        if (const auto text = m_registry.RecordFailure(cause, reason))
            Call(onFailure, report::NameOf(cause), *text);
    } catch (...) { // no memory for the report
    }
}

/// Joins the module to its outbox. After that, or after a refusal was reported, the announcement is deleted.
/// It stays when an exception is thrown, for the next event to try again.
bool Sdk::Attach() {
    const auto& given = *m_announcement;
    m_id = StoredId(given.id);
    process::Membership module{nullptr, given.module.onFailure, given.module.onSuccess,
                               Cut(given.module.version, MAX_TEXT_BYTES),
                               Cut(given.module.name, MAX_TEXT_BYTES)};
    std::string refusal;
    module.engine = m_registry.Acquire(given.dbDir, refusal);
    TellDirectory(module.onFailure, module.engine != nullptr, refusal);
    if (module.engine)
        m_membership = m_registry.Members().Join(std::move(module));
    m_announcement.reset();
    if (!m_membership)
        return false;
    if (!m_membership->engine->Open() && !MovesToTheFirst())
        return false;
    Call(m_membership->onSuccess, "init", m_id);
    return true;
}

/// Reports why the directory that the module gave is not used. Does nothing when it is used.
void Sdk::TellDirectory(Callback onFailure, bool hasOutbox, const std::string& refusal) {
    if (hasOutbox && refusal.empty())
        return;
    const auto text =
        refusal.empty()
            ? m_registry.ReportNoDirectory()
            : m_registry.RecordFailure(report::Cause::Directory,
                                       refusal + (hasOutbox ? "; the module uses the first outbox"
                                                            : "; events of this module are refused"));
    if (text)
        Call(onFailure, NameOf(report::Cause::Directory), *text);
}

/// When the directory of the module's outbox has turned unsafe, moves the module to the first outbox. Returns
/// whether the module has moved and its new outbox is open.
bool Sdk::MovesToTheFirst() {
    if (!m_membership || !Events().IsUnsafe())
        return false;
    auto first = m_registry.Acquire({});
    if (!first || first == m_membership->engine) {
        m_registry.Release(first);
        return false;
    }
    auto module = *m_membership;
    module.engine = std::move(first);
    // Joins the new outbox before it leaves the old one: when Join throws, the module keeps the old one.
    auto moved = m_registry.Members().Join(std::move(module));
    Detach();
    m_membership = std::move(moved);
    return m_membership->engine->Open();
}

void Sdk::Detach() {
    if (m_membership)
        m_registry.Members().Leave(m_membership);
}

bool Sdk::Store(const std::string& eventId, const std::string& eventJson) {
    if (!m_membership)
        return false;
    const ModuleIdentity module{m_id, m_membership->version, m_membership->name};
    return Events().Append(module, eventId, eventJson);
}

bool Sdk::ReportEvent(std::string eventId, std::string eventJson) {
    try {
        if (m_announcement && m_announcement->isGiven)
            Attach();
        return Store(eventId, eventJson) || (MovesToTheFirst() && Store(eventId, eventJson));
    } catch (const std::exception& error) { // out of memory: nothing was stored
        Tell(report::Cause::Event, error.what());
        return false;
    }
}

} // namespace MetrikSdk
