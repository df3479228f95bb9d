#include "Modules/MetrikSdk/outbox/Outbox.h"

#include <algorithm>
#include <new>
#include <utility>

#include "Modules/MetrikSdk/outbox/Uuid.h"
#include "SystemTool/Clock/LockBefore.h"

namespace MetrikSdk::outbox {

Outbox::Outbox(const std::string& directory, const OutboxSettings& settings, report::Notifier& notifier)
    : m_settings(settings), m_notifier(notifier), m_file(directory, settings.file),
      m_caps(settings.caps, m_waitingCount), m_deadLetters(settings.caps.dropRunEnds) {}

/// Runs `operation` on the open store. When the file turns out to be unusable, runs it a second time on a new
/// or reopened file.
template <typename Operation>
auto Outbox::AttemptTwice(Call& call, Operation operation) {
    for (bool first = true;; first = false) {
        try {
            auto& store = m_file.Ready(call.now, call.patience, call.news);
            LearnAbout(store, call.now);
            return operation(store, call);
        } catch (const StoreError& error) {
            if (!m_file.Failed(error, first, call.now, call.news))
                throw;
        }
    }
}

/// Locks, runs `operation`, unlocks, and reports the messages of this call.
template <typename Operation>
auto Outbox::WithStore(Caller caller, Operation operation) {
    // It is initialised by braces, which a deleted copy constructor would forbid. It never leaves this scope.
    // NOLINTNEXTLINE(cppcoreguidelines-special-member-functions)
    struct TellAtEnd {
        report::Notifier& notifier;
        Call call;
        ~TellAtEnd() { notifier.TellFailures(call.news); }
    } tell{m_notifier, {}};
    const std::lock_guard lock(m_mutex); // released before `tell` is destroyed
    tell.call.now = std::chrono::steady_clock::now();
    tell.call.patience = caller == Caller::Module && !m_patienceUsedUp ? m_settings.file.lockPatience
                                                                       : m_settings.file.shortLockPatience;
    return AttemptTwice(tell.call, std::move(operation));
}

bool Outbox::Open() {
    try {
        WithStore(Caller::Module, [](OutboxStore&, Call&) {});
        return true;
    } catch (const StoreError& error) {
        // While the lock is held, thousands of modules may call this. Only the first of them may wait for
        // long.
        m_patienceUsedUp = true;
        m_isUnsafe = error.fault == StoreFault::Unsafe;
        m_notifier.TellFailure(CauseOf(error), error.what());
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
        WithStore(Caller::Module,
                  [&](OutboxStore& store, Call& call) { StoreEvent(store, module, event, call); });
        return true;
    } catch (const StoreError& error) {
        m_patienceUsedUp = true;
        m_isUnsafe = error.fault == StoreFault::Unsafe;
        Refuse(CauseOf(error), error.what());
    } catch (const std::bad_alloc&) {
        Refuse(report::Cause::File, "Cannot store an event: out of memory");
    }
    return false;
}

void Outbox::Refuse(report::Cause cause, const char* reason) noexcept {
    ++m_refused;
    m_notifier.TellFailure(cause, reason);
}

void Outbox::StoreEvent(OutboxStore& store, const ModuleIdentity& module, const NewEvent& event, Call& call) {
    m_caps.EventStored(store.Store(module, event));
    try {
        FollowEvent(store, call);
    } catch (const std::bad_alloc&) { // the event itself is stored, and the next event tries this again
    }
}

/// What is to be done after an event was stored.
void Outbox::FollowEvent(OutboxStore& store, Call& call) {
    if (m_patienceUsedUp.exchange(false) || m_refused > 0)
        TellEndOfFailures(call);
    try {
        m_caps.KeepWithinCaps(store, call.now, call.news);
    } catch (const StoreError& error) { // the event itself is stored
        call.news.push_back({report::Cause::File, error.what()});
    }
}

void Outbox::TellEndOfFailures(Call& call) {
    const unsigned long refused = m_refused;
    call.news.push_back({report::Cause::File,
                         "Events are stored again; " + std::to_string(refused) + " were refused meanwhile",
                         report::News::Kind::End});
    m_refused -= refused; // only when it is sure to be reported
}

void Outbox::LearnAbout(OutboxStore& store, SteadyTime now) {
    if (m_knownGeneration == m_file.Generation())
        return;
    m_caps.FileOpened(store, now);
    m_knownGeneration = m_file.Generation();
}

Batch Outbox::TakeOne(const EventKey& key) {
    return WithStore(Caller::Uploader, [&](OutboxStore& store, Call&) {
        m_caps.SetUnderWay(key.row);
        return store.One(key);
    });
}

Batch Outbox::Take(std::size_t maxEvents, const EventKeys& without) {
    return WithStore(Caller::Uploader, [&](OutboxStore& store, Call& call) {
        m_caps.TellIfOver(call.now, call.news);
        TellDeadLetters(m_deadLetters.TakeEnded(call.now), call.news);
        auto batch = store.Oldest(maxEvents, m_settings.batch.maxBytes, without);
        if (batch.events.empty())
            m_caps.Recount(store);
        else
            m_caps.SetUnderWay(batch.events.back().row);
        return batch;
    });
}

void Outbox::Release() {
    const std::lock_guard lock(m_mutex);
    m_caps.SetUnderWay(0);
}

void Outbox::RemoveDelivered(const Batch& batch, std::size_t refused) {
    WithStore(Caller::Uploader, [&](OutboxStore& store, Call&) {
        store.RemoveDelivered(batch, refused);
        m_caps.Recount(store);
    });
}

void Outbox::NoteUploadFailure(const std::string& text) {
    WithStore(Caller::Uploader, [&](OutboxStore& store, Call&) { store.NoteUploadFailure(text, WallNow()); });
}

void Outbox::MoveToDeadLetters(const StoredEvent& event, const Refusal& refusal) {
    WithStore(Caller::Uploader, [&](OutboxStore& store, Call& call) {
        const auto module = store.MoveToDeadLetters(event, refusal, WallNow());
        if (!module.empty())
            m_deadLetters.Add(module, 1, call.now, WallNow());
        try {
            m_caps.KeepDeadLettersWithinCaps(store, call.news);
        } catch (const StoreError& error) { // the event itself was moved, and the caller reports that next
            call.news.push_back({report::Cause::File, error.what()});
        }
        m_caps.Recount(store);
    });
}

void Outbox::TellDeadLetters(const std::optional<std::string>& totals, std::vector<report::News>& news) {
    if (totals)
        news.push_back(
            {report::Cause::Refusal, "Moved to the dead letters: " + *totals, report::News::Kind::Totals});
}

void Outbox::EndRuns() {
    std::vector<report::News> news;
    {
        const auto patience = m_isHeldUp ? std::chrono::milliseconds(0) : m_settings.file.shortLockPatience;
        const auto lock = SystemTool::Clock::LockBefore(m_mutex, std::chrono::steady_clock::now() + patience);
        m_isHeldUp = !lock;
        if (!lock)
            return;
        m_caps.EndRun(news);
        TellDeadLetters(m_deadLetters.Take(), news);
    }
    m_notifier.TellFailures(news);
}

OutboxStatus Outbox::Status() {
    return WithStore(Caller::Uploader, [](OutboxStore& store, Call&) { return store.Status(); });
}

} // namespace MetrikSdk::outbox
