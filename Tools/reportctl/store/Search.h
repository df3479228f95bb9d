#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>

#include <SQLiteCpp/Database.h>

#include "Tools/reportctl/store/RecentRows.h"

namespace reportctl::store {

/// A row that was found.
struct FoundRow {
    std::int64_t id = 0;
    std::string at;      ///< in UTC; empty when createTime is not a time
    std::string atLocal; ///< the same in local time, without a zone
    std::string event;
    std::string value;
    std::string createTime;
    std::string openid;
};

/// Says of a row whether it is to be found, though it does not have the text.
using IsWanted = std::function<bool(const RowContent&)>;

/// Calls `visit` with each row that has the text in its event id, value, createTime or open id, and with each
/// row that `isWanted` names. `isWanted` may be empty. The oldest row comes first.
void Search(SQLite::Database& database, const std::string& text, const IsWanted& isWanted,
            const std::function<void(const FoundRow&)>& visit);

/// The row with the lowest id. Nothing when the store has no row.
std::optional<FoundRow> OldestRow(SQLite::Database& database);

} // namespace reportctl::store
