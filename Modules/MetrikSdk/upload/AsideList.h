#pragma once

#include <chrono>
#include <cstdint>
#include <map>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk::upload {

/// The events that a collector does not take alone, though it never says that they are bad. They stay in the
/// outbox, and others go past them:
///
///     waiting ──► aside ──┬─► taken          at one of its tries
///                  ▲  │   └─► dead-lettered  after AsideSettings::strikes
///                  └──┘ a try fails
///
/// A try that fails is a strike only when other events were taken since the try before: while a collector is
/// away, nothing is any event's fault. An event is tried at once when others were taken for the first time,
/// and then with pauses that double.
///
/// It is kept in memory. A process that starts anew searches once more, which costs some requests; in the
/// file, it would cost a write at each try, and a column in every event.
/// Threads: one. Pure: the time is the caller's.
class AsideList {
public:
    explicit AsideList(const AsideSettings& settings) : m_settings(settings) {}

    /// What is aside, for Outbox::Take to leave out.
    const EventKeys& Keys() const { return m_keys; }

    bool IsFull() const { return m_keys.size() >= m_settings.maxEvents; }

    void Add(const StoredEvent& event, WallTime now);
    void Remove(std::int64_t row);

    /// An event other than those that are aside was taken, or one of them.
    void OtherWasTaken();

    /// The event whose turn it is, if there is one.
    std::optional<EventKey> Due(WallTime now) const;

    /// Until the next one is due, however many there are; nothing when there is none.
    std::optional<std::chrono::milliseconds> UntilDue(WallTime now) const;

    struct Strikes {
        int count = 0;
        bool isNew = false; ///< The try that just failed was one.
        bool areOut = false;
    };

    /// The event was tried and failed.
    Strikes Failed(std::int64_t row, WallTime now);

private:
    struct Entry {
        WallTime notBefore{};
        int strikes = 0;
        bool othersWereTaken = false; ///< Since it was last tried.
    };

    bool IsDue(const Entry& entry, WallTime now) const;
    std::chrono::milliseconds PauseAfter(int strikes) const;

    const AsideSettings m_settings;
    EventKeys m_keys;
    std::map<std::int64_t, Entry> m_entries; ///< By row.
};

} // namespace MetrikSdk::upload
