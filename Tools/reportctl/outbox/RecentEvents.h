#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <optional>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <utility>

#include <SQLiteCpp/Database.h>

#include "Tools/reportctl/outbox/Events.h"

namespace reportctl::outbox {

/// The parts of a report that its event in the outbox holds.
struct EventContent {
    std::string eventID;
    std::string value; ///< empty, or JSON
    std::string createTime;
};

/// The hash of the event that the service makes of a report; nullopt when it makes none, because the value is
/// no data of an event.
std::optional<std::size_t> HashOf(const EventContent& report);

/// The hash of an event: the same as that of the report that it was made of.
std::size_t HashOf(const Event& event);

/// Finds the newest events of the outbox, waiting or dead, by their content. Each event is found once only,
/// so two equal reports need two events. It also knows how many events each module has stored: a delivered
/// event has left the outbox, and only that number shows that it was there.
///
/// Memory: about 150 bytes for each event. Only hashes of its texts are kept.
///
/// One thread. Failure: ReadNew throws what OpenToLook throws.
class RecentEvents {
public:
    explicit RecentEvents(std::string path) : m_path(std::move(path)) {}

    /// Reads the events that were added since the last call. The first call reads the last `before` events of
    /// each table.
    void ReadNew(std::int64_t before);

    /// Finds an event that was made of this report. It is then removed from this object, and is no longer
    /// part of Uncounted. Returns false when there is no such event.
    bool Take(const EventContent& report, const std::string& module);

    /// How many events the module had stored at the first reading.
    std::int64_t Before(const std::string& module) const;

    /// How many events the module has stored since the first reading, without those that Take found or Count
    /// was told.
    std::int64_t Uncounted(const std::string& module) const;

    /// Subtracts so many events from Uncounted: the caller knows the reports that they were made of.
    void Count(const std::string& module, std::int64_t events) { m_counted[module] += events; }

private:
    using Hash = std::size_t;

    struct Known {
        Hash uuid = 0;
        std::int64_t sequence = 0;
    };

    void Read(SQLite::Database& database, Where where, std::int64_t& lastRow, std::int64_t before);
    void Add(const Event& event);
    void Trim();

    std::string m_path;
    bool m_isFirst = true;
    std::int64_t m_lastWaiting = 0;
    std::int64_t m_lastDead = 0;
    std::unordered_multimap<Hash, Known> m_events; ///< by the hash of the report's texts
    std::deque<std::pair<Hash, Hash>> m_order;     ///< hashes of the report and of the uuid, oldest first
    std::unordered_set<Hash> m_uuids; ///< an event that becomes a dead letter is read twice, kept once
    std::map<std::string, std::int64_t> m_before;
    std::map<std::string, std::int64_t> m_stored;
    std::map<std::string, std::int64_t> m_counted; ///< events since the first reading whose report is known
};

} // namespace reportctl::outbox
