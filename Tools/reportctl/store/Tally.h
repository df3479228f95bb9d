#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <tuple>
#include <vector>

#include <SQLiteCpp/Database.h>

#include "Tools/reportctl/store/Reports.h"

namespace reportctl::store {

/// By which key rows and events are counted.
enum class Grouping { Hour, Day, Event, Module };

/// What a row counts under. `text` is nullopt for a row without a key: it has no time, or no bar in its event
/// id. `hour` is the second since 1970 at which an hour begins, and 0 for other groupings. It gives the order
/// of two hours with one name: when summer time ends, they differ in the offset from UTC only.
struct Key {
    std::int64_t hour = 0;
    std::optional<std::string> text;

    bool operator<(const Key& other) const { return std::tie(hour, text) < std::tie(other.hour, other.text); }
};

/// Counts by key.
using Tally = std::map<Key, std::int64_t>;

/// A key and its count.
struct Count {
    std::optional<std::string> key;
    std::int64_t count = 0;

    bool operator==(const Count&) const = default;
};

/// In which time a day or an hour begins: in local time, or in UTC.
enum class Zone { Local, Utc };

/// Counts the rows of the store into `tally`. Reads in pieces (see InPieces).
void CountRows(SQLite::Database& database, Grouping grouping, const ReportFilter& filter, Zone zone,
               Tally& tally);

/// Numbers of rows by quarter-hour; a key is the number of the quarter-hour since 1970. A reader in any time
/// zone can sum them to hours and days.
using QuarterHours = std::map<std::int64_t, std::int64_t>;

/// Counts the rows that have a time. Reads in pieces (see InPieces).
QuarterHours CountByQuarterHour(SQLite::Database& database, const ReportFilter& filter);

/// Counts the events of an outbox into `tally`: the waiting events and the dead letters. An event's time is
/// the one that the sender gave it, as with a row. The time when it was stored does not count.
void CountEvents(SQLite::Database& database, Grouping grouping, const ReportFilter& filter, Zone zone,
                 Tally& tally);

/// The counts in the order in which a person reads them: hours and days by time, other keys from the most
/// frequent to the least. The count without a key comes last. Unless `top` is 0, only the `top` most frequent
/// ones are returned.
std::vector<Count> Ranked(const Tally& tally, Grouping grouping, std::size_t top);

} // namespace reportctl::store
