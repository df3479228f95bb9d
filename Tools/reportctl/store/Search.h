#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include <SQLiteCpp/Database.h>

namespace reportctl::store {

/// A row that was found.
struct FoundRow {
    std::int64_t id = 0;
    std::string at; ///< in UTC; empty when createTime is not a time
    std::string event;
    std::string value;
    std::string createTime;
    std::string openid;
};

/// Calls `visit` with each row that has the text in its event id, value, createTime or open id. The oldest
/// row comes first.
void Search(SQLite::Database& database, const std::string& text,
            const std::function<void(const FoundRow&)>& visit);

/// The time of the oldest row by its createTime, in UTC. Empty when the store has no row, or when the row's
/// createTime is not a time.
std::string OldestTime(SQLite::Database& database);

} // namespace reportctl::store
