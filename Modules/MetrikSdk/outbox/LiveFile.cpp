#include "Modules/MetrikSdk/outbox/LiveFile.h"

#include <utility>

namespace MetrikSdk::outbox {
namespace {

constexpr const char* FILE_NAME = "MetrikOutbox.db";

} // namespace

LiveFile::LiveFile(std::string directory, const FileSettings& settings)
    : m_directory(std::move(directory)), m_path(m_directory + "/" + FILE_NAME), m_settings(settings) {}

OutboxStore& LiveFile::Ready(SteadyTime now, std::chrono::milliseconds patience,
                             std::vector<report::News>& news) {
    // Checked for every event: an event that goes into a deleted file would be lost after Append returned
    // true.
    if (m_store && Sqlite::IdentityOf(m_path) != m_identity) {
        m_store.reset(); // the path leads to another file, and SQLite leaves that file's log and index alone
        news.push_back({report::Cause::Vanished,
                        m_path + " was deleted or replaced, with all events that waited in it"});
    }
    if (m_store && !m_store->IsWhole())
        Rescue(news);
    // There was no memory for the end of a transaction. Closing the file rolls it back.
    if (m_store && m_store->InTransaction())
        m_store.reset();
    if (m_store) {
        m_store->SetLockPatience(patience);
        return *m_store;
    }
    if (m_failedAt && now - *m_failedAt < m_settings.reopenInterval)
        throw StoreError(m_lastFault, m_lastError);
    try {
        OpenOrBegin(patience, news);
    } catch (const StoreError& error) {
        if (error.fault != StoreFault::TryLater)
            CloseUntilLater(error, now);
        throw;
    }
    m_failedAt.reset();
    return *m_store;
}

/// A deleted log would also take all later events with it. So the file is closed, and the next opening begins
/// a new log.
void LiveFile::Rescue(std::vector<report::News>& news) {
    if (!m_store->Rescue())
        news.push_back(
            {report::Cause::Vanished, m_path + "-wal was deleted, with the events that were only in it"});
    m_store.reset();
}

void LiveFile::OpenOrBegin(std::chrono::milliseconds patience, std::vector<report::News>& news) {
    try {
        Open(patience);
    } catch (const StoreError& error) {
        if (error.fault != StoreFault::SetAside)
            throw;
        SetAside(error.what(), news);
        Open(patience);
    }
}

void LiveFile::Open(std::chrono::milliseconds patience) {
    m_place = OutboxFiles::OpenDirectory(m_directory, m_settings.dataDirectory);
    m_identity = OutboxFiles::Prepare(*m_place, FILE_NAME);
    m_store = std::make_unique<OutboxStore>(m_place->PathOf(FILE_NAME), patience, m_place->Number());
    ++m_generation;
}

bool LiveFile::Failed(const StoreError& error, bool firstAttempt, SteadyTime now,
                      std::vector<report::News>& news) {
    if (error.fault == StoreFault::TryLater || !m_store)
        return false;
    if (error.fault == StoreFault::SetAside)
        m_store->KeepLogOnClose(true);
    m_store.reset();
    try {
        if (error.fault == StoreFault::SetAside)
            SetAside(error.what(), news);
    } catch (const StoreError& worse) {
        CloseUntilLater(worse, now);
        return false;
    }
    if (!firstAttempt)
        CloseUntilLater(error, now);
    return firstAttempt;
}

void LiveFile::CloseUntilLater(const StoreError& reason, SteadyTime now) {
    m_store.reset();
    m_failedAt = now;
    m_lastError = reason.what();
    // A fault of the directory is reported at each call, because the caller may then use another directory.
    m_lastFault = reason.fault == StoreFault::Unsafe ? StoreFault::Unsafe : StoreFault::TryLater;
}

void LiveFile::SetAside(const std::string& reason, std::vector<report::News>& news) {
    const auto name = OutboxFiles::SetAside(*m_place, FILE_NAME, m_identity, WallNow());
    if (!name.empty())
        news.push_back({report::Cause::Damage, reason + "; the file was set aside as " + name});
}

} // namespace MetrikSdk::outbox
