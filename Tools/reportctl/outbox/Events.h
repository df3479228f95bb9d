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
    std::int64_t status = 0; ///< for a dead letter: the HTTP status that the collector answered
    std::string reason;      ///< for a dead letter: why it was refused
};

/// Which table of the outbox: the waiting events, or the dead letters.
enum class Where { Waiting, Dead };

/// Calls `visit` with each event of the table whose row number is greater than `afterRow`, oldest first.
void ForEach(SQLite::Database& database, Where where, std::int64_t afterRow,
             const std::function<void(const Event&)>& visit);

/// The highest row number of the table; 0 when the table is empty.
std::int64_t LastRow(SQLite::Database& database, Where where);

/// How many events each module has stored in this outbox since the outbox was made.
std::map<std::string, std::int64_t> StoredByModule(SQLite::Database& database);

} // namespace reportctl::outbox
