#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>

#include <SQLiteCpp/Database.h>

namespace reportctl::outbox {

/// An event of the outbox.
struct Event {
    std::int64_t row = 0;
    std::string uuid;
    std::string module;
    std::int64_t sequence = 0;
    std::string eventID;
    std::string payload;
    std::int64_t storedMs = 0;
    std::int64_t bytes = 0;
    bool isDead = false;
    std::int64_t status = 0; ///< of a dead letter: what the collector answered
    std::string reason;      ///< of a dead letter
};

/// Which table.
enum class Where { Waiting, Dead };

/// Calls `visit` with each event of a table whose row is above `afterRow`, oldest first.
void ForEach(SQLite::Database& database, Where where, std::int64_t afterRow,
             const std::function<void(const Event&)>& visit);

/// The highest row of a table, 0 when it is empty.
std::int64_t LastRow(SQLite::Database& database, Where where);

/// How many events each module has stored in this outbox, ever.
std::map<std::string, std::int64_t> StoredByModule(SQLite::Database& database);

} // namespace reportctl::outbox
