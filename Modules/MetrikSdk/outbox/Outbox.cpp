#include "Modules/MetrikSdk/outbox/Outbox.h"

#include <algorithm>
#include <utility>

#include "Modules/MetrikSdk/outbox/Uuid.h"

namespace MetrikSdk::outbox {

Outbox::Outbox(const std::string& directory, const OutboxSettings& settings, report::Notifier& notifier)
    : m_settings(settings), m_notifier(notifier), m_keeper(directory, settings.file) {}

/// Runs `operation` on the open store, a second time on a new or reopened file when the first one turns out
/// to be unusable.
template <typename Operation>
auto Outbox::AttemptTwice(Operation operation) {
    for (bool first = true;; first = false) {
        try {
            auto& store = m_keeper.Ready(m_now, m_patience, m_news);
            LearnAbout(store);
            return operation(store);
        } catch (const StoreError& error) {
            if (!m_keeper.Failed(error, first, m_now, m_news))
                throw;
        }
    }
}

/// Locks, runs `operation`, unlocks, and tells what there was to tell.
template <typename Operation>
auto Outbox::WithStore(Caller caller, Operation operation) {
    // Both are filled by braces, which a deleted copy would forbid, and stay in this scope.
    // NOLINTNEXTLINE(cppcoreguidelines-special-member-functions)
    struct TellAtEnd {
        report::Notifier& notifier;
        std::vector<report::News> news;
        ~TellAtEnd() { notifier.TellFailures(news); }
    } tell{m_notifier, {}};
    const std::lock_guard lock(m_mutex);
    // NOLINTNEXTLINE(cppcoreguidelines-special-member-functions)
    struct CollectNews {
        std::vector<report::News>& from;
        std::vector<report::News>& to;
        ~CollectNews() { to.swap(from); }
    } collect{m_news, tell.news};
    m_now = std::chrono::steady_clock::now();
    m_patience = caller == Caller::Module && !m_patienceUsedUp ? m_settings.file.lockPatience
                                                               : m_settings.file.shortLockPatience;
    return AttemptTwice(std::move(operation));
}

bool Outbox::Open() {
    try {
        WithStore(Caller::Module, [](OutboxStore&) {});
        return true;
    } catch (const StoreError& error) {
        m_patienceUsedUp = true; // thousands of modules may announce themselves while the lock is held
        m_isUnsafe = error.fault == StoreFault::Unsafe;
        m_notifier.TellFailure({CauseOf(error), error.what()});
        return false;
    }
}

bool Outbox::Append(const ModuleIdentity& module, std::string eventId, std::string payload) {
    if (eventId.size() + payload.size() > m_settings.caps.maxEventBytes) {
        m_notifier.TellFailure({report::Cause::Event, "An event of " + std::to_string(payload.size()) +
                                                          " bytes is over the bound and was refused"});
        return false;
    }
    try {
        const auto now = WallNow();
        const NewEvent event{NewUuid(now), std::move(eventId), std::move(payload), now};
        WithStore(Caller::Module, [&](OutboxStore& store) { StoreEvent(store, module, event); });
        return true;
    } catch (const StoreError& error) {
        m_patienceUsedUp = true;
        ++m_refused;
        m_isUnsafe = error.fault == StoreFault::Unsafe;
        m_notifier.TellFailure({CauseOf(error), error.what()});
        return false;
    }
}

void Outbox::StoreEvent(OutboxStore& store, const ModuleIdentity& module, const NewEvent& event) {
    m_waitingBytes += static_cast<std::int64_t>(store.Store(module, event));
    m_waitingCount.Set(++m_waitingEvents);
    if (m_patienceUsedUp.exchange(false))
        TellEndOfFailures();
    try {
        KeepWithinCaps(store);
    } catch (const StoreError& error) { // the event itself is safe
        m_news.push_back({report::Cause::File, error.what()});
    }
}

void Outbox::TellEndOfFailures() {
    m_news.push_back(
        {report::Cause::File,
         "Events are stored again; " + std::to_string(m_refused.exchange(0)) + " were refused meanwhile",
         report::News::Kind::End});
}

/// What is to be known of a file that was just opened.
void Outbox::LearnAbout(OutboxStore& store) {
    if (m_knownGeneration == m_keeper.Generation())
        return;
    Recount(store);
    m_openedSteady = m_now;
    m_openedAt = WallNow();
    m_clocks = PruneRule::BeginWatch(m_openedAt, m_now);
    m_nextAgeCheck = m_now;
    m_knownGeneration = m_keeper.Generation();
}

void Outbox::Recount(OutboxStore& store) {
    const auto status = store.Status();
    m_waitingEvents = status.waiting;
    m_waitingBytes = status.waitingBytes + status.moduleBytes; // both are on the disk
    m_waitingCount.Set(m_waitingEvents);
}

void Outbox::KeepWithinCaps(OutboxStore& store) {
    const auto excess = PruneRule::ExcessBytes(m_waitingBytes, m_settings.caps);
    const bool lookForOld = m_now >= m_nextAgeCheck;
    if (excess == 0 && !lookForOld)
        return;
    Drop(store, OldestAllowed(), excess);
}

WallTime Outbox::OldestAllowed() {
    const auto wall = WallNow();
    m_clocks = PruneRule::LookAgain(m_clocks, wall, m_now);
    if (!PruneRule::MayDropByAge(m_clocks, m_settings.caps))
        return WallTime::min();
    const auto elapsed = std::chrono::duration_cast<std::chrono::milliseconds>(m_now - m_openedSteady);
    return PruneRule::OldestAllowed(wall, m_openedAt, elapsed, m_settings.caps);
}

void Outbox::Drop(OutboxStore& store, WallTime before, std::int64_t excess) {
    const auto maxRows = m_settings.caps.maxDropsAtOnce;
    const auto dropped = store.DropOldest(m_underWayUpTo, before, excess, maxRows);
    Recount(store);
    if (dropped < maxRows) // else more may be due: the next event goes on
        m_nextAgeCheck = m_now + m_settings.caps.ageCheckInterval;
    if (dropped > 0)
        TellDrop(dropped);
}

void Outbox::TellDrop(std::size_t dropped) {
    if (PruneRule::BeginsRun(m_lastDrop, m_now, m_settings.caps))
        m_news.push_back({report::Cause::Drop,
                          "The outbox is over its bounds: the oldest events are being dropped, " +
                              std::to_string(dropped) + " of them just now; the outbox counts the others"});
    m_lastDrop = m_now;
}

Batch Outbox::Take(std::size_t maxEvents) {
    return WithStore(Caller::Uploader, [&](OutboxStore& store) {
        auto batch = store.Oldest(maxEvents, m_settings.batch.maxBytes);
        if (batch.events.empty())
            Recount(store);
        else
            m_underWayUpTo = batch.events.back().row;
        return batch;
    });
}

void Outbox::Release() {
    const std::lock_guard lock(m_mutex);
    m_underWayUpTo = 0;
}

void Outbox::RemoveDelivered(const Batch& batch, std::size_t refused) {
    WithStore(Caller::Uploader, [&](OutboxStore& store) {
        store.RemoveDelivered(batch, refused);
        Recount(store);
    });
}

void Outbox::MoveToDeadLetters(const StoredEvent& event, const Refusal& refusal) {
    WithStore(Caller::Uploader, [&](OutboxStore& store) {
        store.MoveToDeadLetters(event, refusal, WallNow());
        KeepDeadLettersWithinCaps(store);
        Recount(store);
    });
}

void Outbox::KeepDeadLettersWithinCaps(OutboxStore& store) {
    try {
        const auto trimmed =
            store.TrimDeadLetters(m_settings.caps.maxDeadLetters, m_settings.caps.maxDeadLetterBytes);
        if (trimmed > 0)
            m_news.push_back(
                {report::Cause::Drop, "The dead letters are over their bounds: the oldest were deleted, " +
                                          std::to_string(trimmed) + " of them just now"});
    } catch (const StoreError& error) { // the event itself was moved, which is what is to be told next
        m_news.push_back({report::Cause::File, error.what()});
    }
}

OutboxStatus Outbox::Status() {
    return WithStore(Caller::Uploader, [](OutboxStore& store) { return store.Status(); });
}

} // namespace MetrikSdk::outbox
