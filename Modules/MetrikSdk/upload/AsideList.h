#pragma once

#include <chrono>
#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk::upload {

/// The events that a collector does not take when they are sent alone, though it never says that they are
/// bad. They stay in the outbox, and other events are sent before them:
///
///     waiting ──► aside ──┬─► taken          at one of its tries
///        ▲         │ ▲  │ └─► dead-lettered  after AsideSettings::strikes or AsideSettings::tries
///        │         │ └──┘ a try fails
///        └─────────┘ when another event of this list is taken, and this one has no failed try that counts
///
/// A failed try counts only when other events were taken since the try before: while a collector is away, no
/// event is at fault. An event is tried at once when others were taken for the first time, and then after
/// pauses that double.
///
/// A try that counts is a strike when the next request of others is taken, too. A collector that has too much
/// to do takes some requests and not others. So when the next request of others fails, all strikes of the
/// event are void. Without a limit for tries, an event could then stay here for ever while many others are
/// bad.
///
/// While a collector is away, each request that it does not take moves one more event aside. When it is back,
/// the first of them is taken, and the rest wait again like all other events. Otherwise each of a million
/// machines would send many requests of one event to a collector that has just returned.
///
/// At most AsideSettings::maxEvents are tried. Further events are passed: other events are sent before them,
/// too, and they are tried once there is room. While the list is full, the events that are tried can only
/// leave it if others are taken. So a further event must not hold up the others.
///
/// The list is kept in memory. A process that starts anew has to find these events again, which takes some
/// requests. To keep the list in the file would take a write at each try, and a column in every event.
/// Threads: one. Pure: the caller passes the time.
class AsideList {
public:
    explicit AsideList(const AsideSettings& settings) : m_settings(settings) {}

    /// The events in this list; Outbox::Take leaves them out.
    const EventKeys& Keys() const { return m_keys; }

    void Add(const EventKey& event, WallTime now);
    void Remove(std::int64_t row);

    /// Call this when events were taken that are not in this list.
    void OtherWasTaken();

    /// Call this when a request with events that are not in this list must be repeated.
    void OtherFailed();

    /// Call this when this event of the list was taken. It leaves the list, as do the events that have no
    /// failed try that counts.
    void Taken(std::int64_t row);

    /// An event that may be tried now, if there is one.
    std::optional<EventKey> Due(WallTime now) const;

    /// How long until the next event is due; nothing when the list is empty.
    std::optional<std::chrono::milliseconds> UntilDue(WallTime now) const;

    struct Strikes {
        int tries = 0;       ///< Failed tries that count.
        bool isNew = false;  ///< The try that just failed counts.
        bool areOut = false; ///< The event was tried often enough.
    };

    /// Call this when the event was tried and failed.
    Strikes Failed(std::int64_t row, WallTime now);

private:
    struct Entry {
        WallTime notBefore{};
        int tries = 0;                ///< Failed tries that count.
        int strikes = 0;              ///< In a row.
        bool othersWereTaken = false; ///< Since the last try of this event.
    };

    void AdmitThePassed();
    bool IsDue(const Entry& entry, WallTime now) const;
    std::chrono::milliseconds PauseAfter(int tries) const;

    const AsideSettings m_settings;
    EventKeys m_keys;
    std::map<std::int64_t, Entry> m_entries; ///< By row. An event without an entry is passed.
    std::set<std::int64_t> m_uncertain; ///< Rows with a strike after which no request of others was answered.
};

} // namespace MetrikSdk::upload
