#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <utility>

#include <SQLiteCpp/Database.h>

#include "Tools/reportctl/outbox/Events.h"

namespace reportctl::outbox {

/// What an event holds of the report that it was made of.
struct EventContent {
    std::string eventID;
    std::string value; ///< empty, or JSON
    std::string createTime;
};

/// The youngest events of the outbox, waiting or dead, to be found by their content, and how many each module
/// has stored: a delivered event has left the outbox, and only that number tells of it. An event is found
/// once, so that two equal reports need two.
///
/// One thread. Failure: ReadNew throws what OpenToLook throws.
class RecentEvents {
public:
    explicit RecentEvents(std::string path) : m_path(std::move(path)) {}

    /// Reads what came since; the first time, the last `before` events.
    void ReadNew(std::int64_t before);

    /// Whether an event was made of this report. It is then taken away, and no longer part of Uncounted.
    bool Take(const EventContent& report, const std::string& module);

    /// How many events the module has stored before the first reading, and since then without one that Take
    /// found.
    std::int64_t Before(const std::string& module) const;
    std::int64_t Uncounted(const std::string& module) const;

    /// So many of Uncounted are reports that are known.
    void Count(const std::string& module, std::int64_t events) { m_counted[module] += events; }

private:
    struct Known {
        std::string uuid;
        std::string payload;
        std::int64_t sequence = 0;
    };

    void Read(SQLite::Database& database, Where where, std::int64_t& lastRow, std::int64_t before);
    void Add(const Event& event);
    void Trim();

    std::string m_path;
    bool m_isFirst = true;
    std::int64_t m_lastWaiting = 0;
    std::int64_t m_lastDead = 0;
    std::unordered_map<std::string, std::deque<Known>> m_events; ///< by event id and time
    std::deque<std::pair<std::string, std::string>> m_order;     ///< keys and uuids, oldest first
    std::unordered_set<std::string> m_uuids; ///< an event that becomes a dead letter is read twice
    std::map<std::string, std::int64_t> m_before;
    std::map<std::string, std::int64_t> m_stored;
    std::map<std::string, std::int64_t> m_counted; ///< of those since the first reading
};

} // namespace reportctl::outbox
