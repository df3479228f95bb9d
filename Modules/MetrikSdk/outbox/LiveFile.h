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
/// Threads: one at a time. Messages are appended to `news`; the caller reports them when it holds no lock.
class LiveFile {
public:
    LiveFile(std::string directory, const FileSettings& settings);

    /// The open store. Its operations wait up to `patience` for another process's lock. Throws StoreError
    /// while the file cannot be opened. After a failure, this tries again once in
    /// FileSettings::reopenInterval. When the lock or a full disk was the reason, it tries again at every
    /// call.
    OutboxStore& Ready(SteadyTime now, std::chrono::milliseconds patience, std::vector<report::News>& news);

    /// Call this when an operation of the store failed. Returns whether the operation is to be tried again at
    /// once, which only a first attempt is. After a second failure, the file is closed for
    /// FileSettings::reopenInterval.
    bool Failed(const StoreError& error, bool firstAttempt, SteadyTime now, std::vector<report::News>& news);

    /// Changes with every file that is opened. What is known about the file before is then no longer true.
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
    /// Checked again at each opening. It must outlive the store in it.
    std::optional<Sqlite::SafeDirectory> m_place;
    std::unique_ptr<OutboxStore> m_store;
    Sqlite::Identity m_identity{};
    unsigned m_generation = 0;
    std::optional<SteadyTime> m_failedAt;
    std::string m_lastError;
    StoreFault m_lastFault = StoreFault::TryLater;
};

} // namespace MetrikSdk::outbox
