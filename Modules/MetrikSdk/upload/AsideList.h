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

/// The events that a collector does not take when they are sent alone, though it never says that they are
/// bad. They stay in the outbox, and other events are sent before them:
///
///     waiting ──► aside ──┬─► taken          at one of its tries
///                  ▲  │   └─► dead-lettered  after AsideSettings::strikes
///                  └──┘ a try fails
///
/// A try that fails is a strike only when other events were taken since the try before: while a collector is
/// away, no event is at fault. An event is tried at once when others were taken for the first time, and then
/// after pauses that double.
///
/// The list is kept in memory. A process that starts anew has to find these events again, which takes some
/// requests. To keep the list in the file would take a write at each try, and a column in every event.
/// Threads: one. Pure: the caller passes the time.
class AsideList {
public:
    explicit AsideList(const AsideSettings& settings) : m_settings(settings) {}

    /// The events in this list; Outbox::Take leaves them out.
    const EventKeys& Keys() const { return m_keys; }

    bool IsFull() const { return m_keys.size() >= m_settings.maxEvents; }

    void Add(const EventKey& event, WallTime now);
    void Remove(std::int64_t row);

    /// Call this when an event was taken, whether it was in this list or not.
    void OtherWasTaken();

    /// An event that may be tried now, if there is one.
    std::optional<EventKey> Due(WallTime now) const;

    /// How long until the next event is due; nothing when the list is empty.
    std::optional<std::chrono::milliseconds> UntilDue(WallTime now) const;

    struct Strikes {
        int count = 0;
        bool isNew = false; ///< The try that just failed was a strike.
        bool areOut = false;
    };

    /// Call this when the event was tried and failed.
    Strikes Failed(std::int64_t row, WallTime now);

private:
    struct Entry {
        WallTime notBefore{};
        int strikes = 0;
        bool othersWereTaken = false; ///< Since the last try of this event.
    };

    bool IsDue(const Entry& entry, WallTime now) const;
    std::chrono::milliseconds PauseAfter(int strikes) const;

    const AsideSettings m_settings;
    EventKeys m_keys;
    std::map<std::int64_t, Entry> m_entries; ///< By row.
};

} // namespace MetrikSdk::upload
