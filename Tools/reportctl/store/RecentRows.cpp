#include "Tools/reportctl/store/RecentRows.h"

#include <algorithm>

#include <SQLiteCpp/Statement.h>

#include "Tools/reportctl/store/Store.h"

namespace reportctl::store {
namespace {

/// Rows that never match a line of the log must not fill the memory of a command that runs for days.
constexpr std::size_t MAX_ROWS_KEPT = 1'000'000;

std::string WithSingleQuotes(const std::string& text) {
    std::string stored;
    for (std::size_t at = 0; at < text.size(); ++at) {
        stored += text[at];
        if (text[at] == '\'' && at + 1 < text.size() && text[at + 1] == '\'')
            ++at;
    }
    return stored;
}

std::int64_t LastId(SQLite::Database& database) {
    return database.execAndGet("select coalesce(max(id), 0) from OperLog").getInt64();
}

} // namespace

RowContent AsStored(const RowContent& report) {
    return {WithSingleQuotes(report.eventID), WithSingleQuotes(report.value),
            WithSingleQuotes(report.createTime)};
}

std::size_t HashOf(const RowContent& content) {
    return std::hash<std::string>()(content.eventID + '\0' + content.value + '\0' + content.createTime);
}

void RecentRows::ReadNew(std::int64_t before) {
    auto database = OpenToRead(m_path);
    const auto last = LastId(database);
    if (m_lastId < 0)
        m_lastId = std::max<std::int64_t>(last - before, 0);
    if (last < m_lastId) // the file was replaced by another store
        m_lastId = 0;
    SQLite::Statement rows(
        database,
        "select id, coalesce(eventID, ''), coalesce(value, ''), coalesce(createTime, '') from OperLog "
        "where id > ? order by id");
    rows.bind(1, m_lastId);
    while (rows.executeStep()) {
        m_lastId = rows.getColumn(0).getInt64();
        Add(HashOf(
            {rows.getColumn(1).getString(), rows.getColumn(2).getString(), rows.getColumn(3).getString()}));
    }
}

void RecentRows::Add(Hash row) {
    ++m_rows[row];
    m_order.push_back(row);
    for (; m_order.size() > MAX_ROWS_KEPT; m_order.pop_front())
        Remove(m_order.front());
}

bool RecentRows::Remove(Hash row) {
    const auto found = m_rows.find(row);
    if (found == m_rows.end())
        return false;
    if (--found->second == 0)
        m_rows.erase(found);
    return true;
}

bool RecentRows::Take(const RowContent& report) {
    return Remove(HashOf(AsStored(report)));
}

} // namespace reportctl::store
