#pragma once

#include <cstddef>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>

#include "Modules/MetrikSdk/otlp/EndpointConfig.h"
#include "Modules/MetrikSdk/process/Memberships.h"
#include "Modules/MetrikSdk/process/OutboxEngine.h"
#include "Modules/MetrikSdk/report/FailureReporter.h"

namespace MetrikSdk::process {

/// The outboxes of this process: one for each database directory, however many modules announce themselves.
///
/// Directories come from outside, in datagrams. Empty ones mean the one that the process gave first. So do
/// those that break the rule of Sqlite::SafeDirectory, and every new one once MAX_OUTBOXES are in use: an
/// outbox costs a file and a thread.
///
/// Threads: any.
class OutboxRegistry {
public:
    /// The suite uses one directory, a test installation a second one; the rest is room for the unforeseen.
    static constexpr std::size_t MAX_OUTBOXES = 8;

    using DataDirectory = std::function<std::string()>; ///< Returns the user's data directory.

    OutboxRegistry(const OutboxSettings& settings, otlp::LookUp lookUp, DataDirectory dataDirectory);

    /// The process's own, with production's settings. Never destroyed: SDK objects may outlive static ones.
    static OutboxRegistry& Instance();

    /// The outbox for `directory`; null when there is no directory to use at all. To be given back by
    /// Release.
    std::shared_ptr<OutboxEngine> Acquire(const std::string& directory);

    /// The same; `refusal` tells why it is not the outbox of `directory`, when that must not be used.
    std::shared_ptr<OutboxEngine> Acquire(const std::string& directory, std::string& refusal);

    /// The modules that use the outboxes.
    Memberships& Members() { return m_members; }

    /// Gives `engine` up. The last user's call stops its uploader before it returns; no other thread can open
    /// the same file meanwhile.
    void Release(std::shared_ptr<OutboxEngine>& engine);

    /// What to tell a module that got no outbox, if it is time to tell: the limit on what is told holds for
    /// the process. It begins anew when the last outbox in use was released, whose users have heard it all.
    std::optional<std::string> ReportNoDirectory();
    std::optional<std::string> RecordFailure(report::Cause cause, const std::string& text);

private:
    static std::string Accepted(const std::string& directory, const std::string& dataDirectory,
                                std::string& refusal);
    std::string Choose(const std::string& canonical);
    void ForgetReleased();
    void ForgetWhatWasTold() noexcept;

    const OutboxSettings m_settings;
    const otlp::LookUp m_lookUp;
    const DataDirectory m_dataDirectory;
    std::mutex m_mutex;                                  ///< Guards all below.
    std::shared_ptr<report::FailureReporter> m_reporter; ///< Shared by all outboxes.
    std::string m_firstDirectory;
    std::map<std::string, std::weak_ptr<OutboxEngine>> m_engines; ///< By canonical directory.
    Memberships m_members{*this};                                 ///< Guards itself, and is entered first.
};

} // namespace MetrikSdk::process
