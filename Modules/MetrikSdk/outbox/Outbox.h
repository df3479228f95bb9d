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

/// The outbox of one directory, kept within its caps. All modules of a process and the uploader use it.
///
/// Threads: any. One lock guards the one connection, because every operation is short. No other part of the
/// process uses the connection, so it can be closed safely when its file is to be set aside.
/// Failure: Append and Open return false, the others throw StoreError. Append and Open report failures to the
/// notifier. Each operation that notices damage or drops reports them, too. No report is made while the lock
/// is held.
class Outbox {
public:
    Outbox(const std::string& directory, const OutboxSettings& settings, report::Notifier& notifier);

    /// Opens the file, so that a problem is known early. When this returns false, later calls try again.
    bool Open();

    /// Stores the event. Returns true once the event survives kill -9 of this process.
    bool Append(const ModuleIdentity& module, std::string eventId, std::string payload);

    /// Whether the last event or opening that failed did so because another user could change the directory.
    /// Then the modules must use another outbox.
    bool IsUnsafe() const { return m_isUnsafe; }

    /// The oldest events, without those of `without`. Until Release they count as being sent, also when the
    /// file is opened anew meanwhile: a cap then drops other events.
    Batch Take(std::size_t maxEvents, const EventKeys& without = {});

    /// The event, if it still waits. It counts as being sent until Release, too.
    Batch TakeOne(const EventKey& key);
    void Release();

    void RemoveDelivered(const Batch& batch, std::size_t refused);
    void NoteUploadFailure(const std::string& text);
    void MoveToDeadLetters(const StoredEvent& event, const Refusal& refusal);

    /// Reports the totals of what is being lost, because a callback is about to be removed. Does nothing when
    /// another thread keeps the lock for longer than shortLockPatience: that thread may hang in the file
    /// system, and the removal must not wait for it. Hundreds of modules may leave in a row, so only the
    /// first of them waits.
    void EndRuns();

    OutboxStatus Status();

    /// The number of waiting events, as far as this process knows. It learns within a minute what another
    /// process has done to the same file.
    CountWaiter& WaitingCount() { return m_waitingCount; }

private:
    /// Who waits for another process's lock. A module's event would be lost after the wait; the uploader
    /// comes back later.
    enum class Caller { Module, Uploader };

    /// The data of one call.
    struct Call {
        SteadyTime now;
        std::chrono::milliseconds patience; ///< how long to wait for another process's lock
        std::vector<report::News> news;     ///< reported once the lock is released
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

    /// The last event or opening failed, perhaps after the full wait for a lock. So the next one waits less.
    std::atomic<bool> m_patienceUsedUp = false;
    std::atomic<bool> m_isUnsafe = false;
    std::atomic<bool> m_isHeldUp = false; ///< The last EndRuns did not get the lock.
    /// Events that were refused since the last one that was stored.
    std::atomic<unsigned long> m_refused = 0;

    std::mutex m_mutex; ///< Guards all below.
    LiveFile m_file;
    unsigned m_knownGeneration = 0; ///< The generation of m_file that m_caps knows.
    CapKeeper m_caps;
    report::LossRun m_deadLetters;
};

} // namespace MetrikSdk::outbox
