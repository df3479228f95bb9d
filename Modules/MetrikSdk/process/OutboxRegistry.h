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

/// The outboxes of this process: one for each database directory, however many modules use it.
///
/// Directories come from outside, in datagrams. An empty directory means the first one that the process was
/// given. The first one is also used in place of a directory that breaks the rule of Sqlite::SafeDirectory,
/// and of each new directory when MAX_OUTBOXES are in use: an outbox takes a file and a thread.
///
/// Threads: any.
class OutboxRegistry {
public:
    /// The suite uses one directory, and a test installation a second one. The others are room for uses that
    /// we do not know.
    static constexpr std::size_t MAX_OUTBOXES = 8;

    using DataDirectory = std::function<std::string()>; ///< Returns the user's data directory.

    OutboxRegistry(const OutboxSettings& settings, otlp::LookUp lookUp, DataDirectory dataDirectory);

    /// The registry of the process, with the settings of production. It is never destroyed, because SDK
    /// objects may live longer than static objects.
    static OutboxRegistry& Instance();

    /// The outbox that serves `directory`; it can be the first one (see the class). Null when `directory` is
    /// empty or refused and no usable one was given before. Give it back with Release.
    std::shared_ptr<OutboxEngine> Acquire(const std::string& directory);

    /// The same. When `directory` must not be used, `refusal` gets the reason.
    std::shared_ptr<OutboxEngine> Acquire(const std::string& directory, std::string& refusal);

    /// The memberships of the modules that use the outboxes.
    Memberships& Members() { return m_members; }

    /// Gives `engine` up. When no other module uses it, its uploader is stopped before this returns. No other
    /// thread can open the same file meanwhile.
    void Release(std::shared_ptr<OutboxEngine>& engine);

    /// The text to report for a module that got no outbox; nothing when it was reported too recently. The
    /// limit on reports holds for the whole process. It begins anew when the last outbox in use was released,
    /// because every failure was reported to the users of that outbox.
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
    std::map<std::string, std::weak_ptr<OutboxEngine>> m_engines; ///< By canonical path of the directory.
    Memberships m_members{*this}; ///< Has its own mutex, which is locked before m_mutex.
};

} // namespace MetrikSdk::process
