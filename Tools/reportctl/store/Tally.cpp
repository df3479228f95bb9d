#include "Tools/reportctl/store/Tally.h"

#include <algorithm>
#include <ctime>

#include <SQLiteCpp/Statement.h>
#include <fmt/chrono.h>
#include <fmt/format.h>

#include "Tools/reportctl/store/Rows.h"

namespace reportctl::store {
namespace {

/// The offset of every time zone from UTC is a multiple of this. So an hour or a day of any zone consists of
/// whole quarter-hours.
constexpr std::int64_t QUARTER_HOUR_MS = 15LL * 60 * 1000;
constexpr std::int64_t QUARTER_HOUR_S = QUARTER_HOUR_MS / 1000;

/// Counting a row is faster than writing it out, so one statement may take more rows.
constexpr std::int64_t IDS_AT_ONCE_TO_COUNT = 4 * IDS_AT_ONCE;

/// Selects the events of an outbox with columns that have the same names as those of ReportsSelect.
std::string EventsSelect() {
    return fmt::format(R"sql(select event_id as event,
    case when instr(event_id, '|') then substr(event_id, 1, instr(event_id, '|') - 1) end as module,
    {} as time
from (select event_id,
             case when json_valid(payload) then json_extract(payload, '$.extend.createTime') end as created
      from (select event_id, payload from event union all select event_id, payload from dead_letter)))sql",
                       TimeOf("created"));
}

bool IsByTime(Grouping grouping) {
    return grouping == Grouping::Hour || grouping == Grouping::Day;
}

/// The SQL for the key. A time is divided with rounding down, so that times before 1970 are right, too.
std::string KeyColumn(Grouping grouping) {
    if (IsByTime(grouping))
        return fmt::format("(cast(time as integer) - ((cast(time as integer) % {0}) + {0}) % {0}) / {0}",
                           QUARTER_HOUR_MS);
    return grouping == Grouping::Event ? "event" : "module";
}

std::tm WallClock(std::time_t time, Zone zone) {
    std::tm wall{};
    if (zone == Zone::Utc)
        ::gmtime_r(&time, &wall);
    else
        ::localtime_r(&time, &wall);
    return wall;
}

/// The key of an hour, such as 2026-11-21T14:00+01:00, or of a day, such as 2026-11-21.
Key TimeKey(std::int64_t quarterHour, Grouping grouping, Zone zone) {
    const auto time = quarterHour * QUARTER_HOUR_S;
    const auto wall = WallClock(time, zone);
    if (grouping == Grouping::Day)
        return {0, fmt::format("{:%Y-%m-%d}", wall)};
    const auto offset = wall.tm_gmtoff / 60;
    return {time - std::int64_t{wall.tm_min} * 60 - wall.tm_sec,
            fmt::format("{:%Y-%m-%dT%H}:00{}{:02}:{:02}", wall, offset < 0 ? '-' : '+', std::abs(offset) / 60,
                        std::abs(offset) % 60)};
}

Key KeyOf(const SQLite::Column& column, Grouping grouping, Zone zone) {
    if (column.isNull())
        return {};
    if (IsByTime(grouping))
        return TimeKey(column.getInt64(), grouping, zone);
    return {0, column.getString()};
}

void Add(SQLite::Statement& counts, Grouping grouping, Zone zone, Tally& tally) {
    while (counts.executeStep())
        tally[KeyOf(counts.getColumn(0), grouping, zone)] += counts.getColumn(1).getInt64();
}

} // namespace

void CountRows(SQLite::Database& database, Grouping grouping, const ReportFilter& filter, Zone zone,
               Tally& tally) {
    auto counts = SelectReports(database, KeyColumn(grouping) + " as key, count(*)", filter, "group by 1");
    InPieces(AllIds(database), IDS_AT_ONCE_TO_COUNT, [&](IdRange piece) {
        BindPiece(counts, piece);
        Add(counts, grouping, zone, tally);
    });
}

QuarterHours CountByQuarterHour(SQLite::Database& database, const ReportFilter& filter) {
    auto counts = SelectReports(database, KeyColumn(Grouping::Hour) + " as key, count(*)", filter,
                                "and time is not null group by 1");
    QuarterHours quarterHours;
    InPieces(AllIds(database), IDS_AT_ONCE_TO_COUNT, [&](IdRange piece) {
        for (BindPiece(counts, piece); counts.executeStep();)
            quarterHours[counts.getColumn(0).getInt64()] += counts.getColumn(1).getInt64();
    });
    return quarterHours;
}

void CountEvents(SQLite::Database& database, Grouping grouping, const ReportFilter& filter, Zone zone,
                 Tally& tally) {
    SQLite::Statement counts(database, fmt::format("select {} as key, count(*) from ({}) where {} group by 1",
                                                   KeyColumn(grouping), EventsSelect(), filter.Condition()));
    filter.BindTo(counts);
    Add(counts, grouping, zone, tally);
}

std::vector<Count> Ranked(const Tally& tally, Grouping grouping, std::size_t top) {
    std::vector<std::pair<Key, std::int64_t>> ranked(tally.begin(), tally.end());
    std::stable_sort(ranked.begin(), ranked.end(),
                     [](const auto& a, const auto& b) { return a.second > b.second; });
    if (top != 0 && ranked.size() > top)
        ranked.resize(top);
    if (IsByTime(grouping))
        std::sort(ranked.begin(), ranked.end(),
                  [](const auto& a, const auto& b) { return a.first < b.first; });
    std::stable_partition(ranked.begin(), ranked.end(),
                          [](const auto& count) { return count.first.text.has_value(); });
    std::vector<Count> counts;
    counts.reserve(ranked.size());
    for (const auto& [key, count] : ranked)
        counts.push_back({key.text, count});
    return counts;
}

} // namespace reportctl::store
