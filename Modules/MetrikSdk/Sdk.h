#pragma once

#include <memory>
#include <string>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/MetrikSdk/process/OutboxEngine.h"
#include "Modules/MetrikSdk/process/OutboxRegistry.h"
#include "Plugin/IMetrikSdk.h"

namespace MetrikSdk {

/// One module's access to the outbox of its database directory. Each object takes only a few strings, because
/// a process may have thousands of them.
///
/// ReportEvent returns true once the event survives kill -9 of the process, and false when it was not stored.
/// The log directory is not used: all messages go to the callbacks, and the service logs their texts. The
/// failure callback gets what failed and why. The success callback gets "init" and the module's id, or
/// "upload" and how many events.
///
/// A second InitSdk begins anew with its arguments, and ends what the first one began. InitSdk may return
/// false because the file cannot be opened or because there is no memory. That is not final: a later event
/// tries again.
class Sdk final : public IMetrikSdk {
public:
    explicit Sdk(process::OutboxRegistry& registry)
        : m_registry(registry), m_announcement(std::make_unique<Announcement>()) {}
    ~Sdk() { Detach(); }
    Sdk(const Sdk&) = delete;
    Sdk& operator=(const Sdk&) = delete;

    std::string GetSdkVersion() override;
    std::int64_t GetPendingCount() override;
    bool InitSdk(std::string moduleId, std::string moduleVersion, std::string moduleName, std::string logDir,
                 std::string dbDir, Callback onFailure, Callback onSuccess) override;
    bool ReportEvent(std::string eventId, std::string eventJson) override;

private:
    /// The arguments of InitSdk. The texts are not cut yet.
    struct Announcement {
        bool isGiven = false;
        std::string id;
        std::string dbDir;
        process::Membership module; ///< The engine is not set yet.
    };

    bool Attach();
    void TellDirectory(Callback onFailure, bool hasOutbox, const std::string& refusal);
    bool MovesToTheFirst();
    void Detach();
    bool Store(const std::string& eventId, const std::string& eventJson);
    outbox::Outbox& Events() const { return m_membership->engine->Events(); }
    void Tell(report::Cause cause, const char* reason) noexcept;

    process::OutboxRegistry& m_registry;
    /// Null before InitSdk, and when no directory can be used.
    std::shared_ptr<const process::Membership> m_membership;
    std::string m_id;
    /// Kept until the module has joined an outbox, so that the next event can try again. It is made in
    /// advance, so that filling it needs no memory.
    std::unique_ptr<Announcement> m_announcement;
};

} // namespace MetrikSdk
