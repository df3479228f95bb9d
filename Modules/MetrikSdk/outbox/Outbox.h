#pragma once

#include <atomic>
#include <mutex>
#include <string>
#include <vector>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/outbox/CapKeeper.h"
#include "Modules/MetrikSdk/outbox/CountWaiter.h"
#include "Modules/MetrikSdk/outbox/LiveFile.h"
#include "Modules/MetrikSdk/outbox/OutboxStore.h"
#include "Modules/MetrikSdk/report/Notifier.h"

namespace MetrikSdk::outbox {

/// The outbox of one directory, for all modules and the uploader of a process, kept within its caps.
///
/// Threads: any. One lock over one connection, because every operation is short, and a connection that
/// no other part of the process uses can be closed safely when its file is to be set aside.
/// Failure: Append and Open return false, the others throw StoreError. Append and Open tell the notifier,
/// and so does each operation that notices damage or drops; never while the lock is held.
class Outbox {
public:
    Outbox(const std::string& directory, const OutboxSettings& settings, report::Notifier& notifier);

    /// Opens the file, so that a problem is known early. False is not final: later calls try again.
    bool Open();

    /// Stores the event. True once it survives kill -9 of this process.
    bool Append(const ModuleIdentity& module, std::string eventId, std::string payload);

    /// Whether the last event or opening failed because another user could change the directory. Its modules
    /// are to use another outbox.
    bool IsUnsafe() const { return m_isUnsafe; }

    /// The oldest events but those of `without`. They are under way until Release, also when the file is
    /// opened anew meanwhile: a cap drops others first.
    Batch Take(std::size_t maxEvents, const EventKeys& without = {});

    /// The event, if it still waits. The same holds for it.
    Batch TakeOne(const EventKey& key);
    void Release();

    void RemoveDelivered(const Batch& batch, std::size_t refused);
    void MoveToDeadLetters(const StoredEvent& event, const Refusal& refusal);

    /// Tells the totals of what is being lost, because a listener is about to go. Not if another thread hangs
    /// in the file system with the lock: going must not wait for it.
    void EndRuns();

    OutboxStatus Status();

    /// How many events wait, as far as this process knows: it learns within a minute what another process
    /// does to the same file.
    CountWaiter& WaitingCount() { return m_waitingCount; }

private:
    /// Who waits for a lock: a module's event would be lost, the uploader comes back.
    enum class Caller { Module, Uploader };

    /// What belongs to one call and ends with it.
    struct Call {
        SteadyTime now;
        std::chrono::milliseconds patience; ///< with another process's lock
        std::vector<report::News> news;     ///< told once the lock is released
    };

    template <typename Operation>
    auto WithStore(Caller caller, Operation operation);
    template <typename Operation>
    auto AttemptTwice(Call& call, Operation operation);

    void StoreEvent(OutboxStore& store, const ModuleIdentity& module, const NewEvent& event, Call& call);
    static void TellDeadLetters(const std::optional<std::string>& totals, std::vector<report::News>& news);
    void FollowEvent(OutboxStore& store, Call& call);
    void Refuse(report::Cause cause, const char* reason) noexcept;
    void TellEndOfFailures(Call& call);
    void LearnAbout(OutboxStore& store, SteadyTime now);

    const OutboxSettings m_settings;
    report::Notifier& m_notifier;
    CountWaiter m_waitingCount;

    /// The last event or opening failed, perhaps after all of the patience: the next one has less.
    std::atomic<bool> m_patienceUsedUp = false;
    std::atomic<bool> m_isUnsafe = false;
    std::atomic<unsigned long> m_refused = 0; ///< Events since the last one that was stored.

    std::mutex m_mutex; ///< Guards all below.
    LiveFile m_file;
    unsigned m_knownGeneration = 0; ///< Of m_file, that m_caps knows.
    CapKeeper m_caps;
    report::LossRun m_deadLetters;
};

} // namespace MetrikSdk::outbox
