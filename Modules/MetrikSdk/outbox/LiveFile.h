#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/outbox/OutboxFiles.h"
#include "Modules/MetrikSdk/outbox/OutboxStore.h"
#include "Modules/MetrikSdk/outbox/StoreError.h"
#include "Modules/MetrikSdk/report/Notifier.h"

namespace MetrikSdk::outbox {

/// Keeps the outbox file of one directory open and usable:
///
///     closed ──► open ──┬─► damaged   set aside, and a new file begun at once
///       ▲               ├─► vanished  deleted or replaced: a new file begun at once
///       └───────────────┴─► failing   closed, and opened again by a later call
///
/// Threads: one at a time. News is appended for the caller to tell when it holds no lock.
class LiveFile {
public:
    LiveFile(std::string directory, const FileSettings& settings);

    /// The open store, which waits for another process's lock as long as `patience`. Throws StoreError while
    /// the file cannot be opened, which is tried once in FileSettings::reopenInterval, or whenever called if
    /// only the lock or the disk's space was in the way.
    OutboxStore& Ready(SteadyTime now, std::chrono::milliseconds patience, std::vector<report::News>& news);

    /// To be called when an operation of the store failed. Whether a first attempt is worth a second one at
    /// once; a second failure closes the file for FileSettings::reopenInterval.
    bool Failed(const StoreError& error, bool firstAttempt, SteadyTime now, std::vector<report::News>& news);

    /// Changes with every file that is opened: what is known of the file before is no longer true.
    unsigned Generation() const { return m_generation; }

private:
    void Open(std::chrono::milliseconds patience);
    void OpenOrBegin(std::chrono::milliseconds patience, std::vector<report::News>& news);
    void Rescue(std::vector<report::News>& news);
    void CloseUntilLater(const StoreError& reason, SteadyTime now);
    void SetAside(const std::string& reason, std::vector<report::News>& news);

    const std::string m_directory;
    const std::string m_path;
    const FileSettings m_settings;
    std::optional<Sqlite::SafeDirectory>
        m_place; ///< Checked anew with each opening. Outlives the store in it.
    std::unique_ptr<OutboxStore> m_store;
    Sqlite::Identity m_identity{};
    unsigned m_generation = 0;
    std::optional<SteadyTime> m_failedAt;
    std::string m_lastError;
    StoreFault m_lastFault = StoreFault::TryLater;
};

} // namespace MetrikSdk::outbox
