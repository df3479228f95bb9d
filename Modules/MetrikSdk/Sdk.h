#pragma once

#include <memory>
#include <string>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/MetrikSdk/process/OutboxEngine.h"
#include "Modules/MetrikSdk/process/OutboxRegistry.h"
#include "Plugin/IMetrikSdk.h"

namespace MetrikSdk {

/// One module's entry to the outbox of its database directory. Thousands of these cost a few strings each.
///
/// ReportEvent is true once the event survives kill -9 of the process, and false when it was not stored. The
/// log directory is not used: what there is to say goes to the callbacks, whose texts the service logs. The
/// failure callback gets what failed and why; the success callback "init" and the module's id, or "upload"
/// and how many events.
///
/// A second InitSdk begins anew with its arguments, and ends what the first began. One that returns false for
/// a file that cannot be opened, or for want of memory, is not final: a later event tries again.
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
    /// What InitSdk was given, its texts uncut.
    struct Announcement {
        bool isGiven = false;
        std::string id;
        std::string dbDir;
        process::Membership module; ///< Without its engine.
    };

    bool Attach();
    void TellDirectory(Callback onFailure, bool hasOutbox, const std::string& refusal);
    bool MovesToTheFirst();
    void Detach();
    bool Store(const std::string& eventId, const std::string& eventJson);
    outbox::Outbox& Events() const { return m_membership->engine->Events(); }
    void Tell(report::Cause cause, const char* reason) noexcept;

    process::OutboxRegistry& m_registry;
    std::shared_ptr<const process::Membership>
        m_membership; ///< Null before InitSdk, and without any directory.
    std::string m_id;
    /// Kept until the module has been attached, for the next event to try again. Made beforehand: to fill it
    /// takes no memory.
    std::unique_ptr<Announcement> m_announcement;
};

} // namespace MetrikSdk
