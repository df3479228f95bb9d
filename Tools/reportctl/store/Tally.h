#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include <SQLiteCpp/Database.h>

#include "Tools/reportctl/store/Reports.h"

namespace reportctl::store {

/// What rows and events are counted by.
enum class Grouping { Hour, Day, Event, Module };

/// Counts by key. A row that has none (no time, no bar in its event id) is under nullopt.
using Tally = std::map<std::optional<std::string>, std::int64_t>;

/// A key and its count, in the order in which a person reads them.
struct Count {
    std::optional<std::string> key;
    std::int64_t count = 0;

    bool operator==(const Count&) const = default;
};

/// Where a day or an hour begins: in local time, or in UTC.
enum class Zone { Local, Utc };

/// Adds the rows of the store, in pieces (see InPieces).
void CountRows(SQLite::Database& database, Grouping grouping, const ReportFilter& filter, Zone zone,
               Tally& tally);

/// Rows by the number of their quarter-hour since 1970. A reader in any time zone can add them up to hours
/// and days.
using QuarterHours = std::map<std::int64_t, std::int64_t>;

/// Counts the rows that have a time, in pieces.
QuarterHours CountByQuarterHour(SQLite::Database& database, const ReportFilter& filter);

/// Adds the events of an outbox: those that wait, and its dead letters. Their time is what the sender gave
/// them, else when they were stored, as a collector is told it.
void CountEvents(SQLite::Database& database, Grouping grouping, const ReportFilter& filter, Zone zone,
                 Tally& tally);

/// Times in their order; everything else from the most frequent to the least. What has no key comes last. At
/// most `top` of them, the most frequent ones, when that is not 0.
std::vector<Count> Ranked(const Tally& tally, Grouping grouping, std::size_t top);

} // namespace reportctl::store
