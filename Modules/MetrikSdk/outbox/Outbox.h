#pragma once

#include <atomic>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/outbox/CountWaiter.h"
#include "Modules/MetrikSdk/outbox/LiveFile.h"
#include "Modules/MetrikSdk/outbox/OutboxStore.h"
#include "Modules/MetrikSdk/outbox/PruneRule.h"
#include "Modules/MetrikSdk/report/Notifier.h"

namespace MetrikSdk::outbox {

/// The outbox of one directory, for all modules and the uploader of a process, kept within its caps.
///
/// Threads: any. One lock over one connection, because every operation is short, and a connection that
/// nobody else in the process uses can be closed safely when its file is to be set aside.
/// Failure: Append and Open return false, the others throw StoreError. Append and Open tell the notifier,
/// as everybody does who notices damage or drops; never while the lock is held.
class Outbox {
public:
    Outbox(const std::string& directory, const OutboxSettings& settings, report::Notifier& notifier);

    /// Opens the file, so that a problem is known early. False is not final: later calls try again.
    bool Open();

    /// Stores the event. True once it survives kill -9 of this process.
    bool Append(const ModuleIdentity& module, std::string eventId, std::string payload);

    /// Whether the last event or opening failed because another user could change the directory. Its modules are to use
    /// another outbox.
    bool IsUnsafe() const { return m_isUnsafe; }

    /// The oldest events. They are under way until Release, also when the file is opened anew meanwhile: a cap drops
    /// others first.
    Batch Take(std::size_t maxEvents);
    void Release();

    void RemoveDelivered(const Batch& batch, std::size_t refused);
    void MoveToDeadLetters(const StoredEvent& event, const Refusal& refusal);

    OutboxStatus Status();

    /// Rings with the number of waiting events, as far as this process knows it: what another process does to
    /// the same file is learned within a minute.
    CountWaiter& WaitingCount() { return m_waitingCount; }

private:
    /// Who waits for a lock: a module's event would be lost, the uploader comes back.
    enum class Caller { Module, Uploader };

    template <typename Operation>
    auto WithStore(Caller caller, Operation operation);
    template <typename Operation>
    auto AttemptTwice(Operation operation);

    void StoreEvent(OutboxStore& store, const ModuleIdentity& module, const NewEvent& event);
    void TellEndOfFailures();
    void LearnAbout(OutboxStore& store);
    void Recount(OutboxStore& store);
    void KeepWithinCaps(OutboxStore& store);
    WallTime OldestAllowed();
    void Drop(OutboxStore& store, WallTime before, std::int64_t excess);
    void KeepDeadLettersWithinCaps(OutboxStore& store);
    void TellDrop(std::size_t dropped);

    const OutboxSettings m_settings;
    report::Notifier& m_notifier;
    CountWaiter m_waitingCount;

    /// The last event or opening failed, perhaps after all of the patience: the next one has less.
    std::atomic<bool> m_patienceUsedUp = false;
    std::atomic<bool> m_isUnsafe = false;
    std::atomic<unsigned long> m_refused = 0; ///< Events since the last one that was stored.

    std::mutex m_mutex; ///< Guards all below.
    LiveFile m_keeper;
    unsigned m_knownGeneration = 0;
    std::int64_t m_waitingEvents = 0;
    std::int64_t m_waitingBytes = 0;
    std::int64_t m_underWayUpTo = 0;         ///< The last row that was taken and not released.
    std::chrono::milliseconds m_patience{0}; ///< Of the operation under way.
    SteadyTime m_now{};                      ///< Of the operation under way.
    SteadyTime m_openedSteady{};             ///< Both times of when the file was opened.
    WallTime m_openedAt{};
    PruneRule::ClockWatch m_clocks;
    SteadyTime m_nextAgeCheck{};
    std::optional<SteadyTime> m_lastDrop;
    std::vector<report::News> m_news; ///< Told once the lock is released.
};

} // namespace MetrikSdk::outbox
