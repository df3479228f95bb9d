#include "Tools/reportctl/store/RecentRows.h"

#include <algorithm>

#include <SQLiteCpp/Statement.h>

#include "Tools/reportctl/store/Store.h"

namespace reportctl::store {
namespace {

/// Rows that never match a line of the log must not fill the memory of a command that runs for days.
constexpr std::size_t MAX_ROWS_KEPT = 1'000'000;

std::string KeyOf(const RowContent& content) {
    return content.eventID + '\0' + content.value + '\0' + content.createTime;
}

/// The text as the row has it: the service puts it unchanged into its SQL, where two quotes mean one quote.
std::string AsStored(const std::string& text) {
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
        Add(m_lastId, KeyOf({rows.getColumn(1).getString(), rows.getColumn(2).getString(),
                             rows.getColumn(3).getString()}));
    }
}

void RecentRows::Add(std::int64_t id, std::string key) {
    m_ids[key].push_back(id);
    m_order.push_back(std::move(key));
    for (; m_order.size() > MAX_ROWS_KEPT; m_order.pop_front())
        if (const auto found = m_ids.find(m_order.front()); found != m_ids.end()) {
            found->second.pop_front();
            if (found->second.empty())
                m_ids.erase(found);
        }
}

std::int64_t RecentRows::Take(const RowContent& report) {
    const auto found =
        m_ids.find(KeyOf({AsStored(report.eventID), AsStored(report.value), AsStored(report.createTime)}));
    if (found == m_ids.end())
        return 0;
    const auto id = found->second.front();
    found->second.pop_front();
    if (found->second.empty())
        m_ids.erase(found);
    return id;
}

} // namespace reportctl::store
