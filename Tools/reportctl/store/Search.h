#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include <SQLiteCpp/Database.h>

namespace reportctl::store {

/// A row that was found.
struct FoundRow {
    std::int64_t id = 0;
    std::string at; ///< UTC; empty when createTime is no time
    std::string event;
    std::string value;
    std::string createTime;
    std::string openid;
};

/// Calls `visit` with each row that holds the text in its event id, value, createTime or open id, oldest
/// first.
void Search(SQLite::Database& database, const std::string& text,
            const std::function<void(const FoundRow&)>& visit);

/// When the oldest row was made, by its own word, in UTC; empty when there is none, or it does not say.
std::string OldestTime(SQLite::Database& database);

} // namespace reportctl::store
