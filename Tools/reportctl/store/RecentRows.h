#pragma once

#include <cstdint>
#include <deque>
#include <string>
#include <unordered_map>

namespace reportctl::store {

/// What a report's row holds of the report.
struct RowContent {
    std::string eventID;
    std::string value;
    std::string createTime;
};

/// The youngest rows of the store, to be found by their content. A row is found once, so that two equal
/// reports need two.
///
/// One thread. Failure: ReadNew throws SQLite::Exception, and std::runtime_error when the store is missing.
class RecentRows {
public:
    explicit RecentRows(std::string path) : m_path(std::move(path)) {}

    /// Reads the rows that came since; the first time, the last `before` rows.
    void ReadNew(std::int64_t before);

    /// The id of the row that the service makes of this report, which is then taken away; 0 when there is
    /// none.
    std::int64_t Take(const RowContent& report);

private:
    void Add(std::int64_t id, std::string key);

    std::string m_path;
    std::int64_t m_lastId = -1; ///< -1: nothing was read yet
    std::unordered_map<std::string, std::deque<std::int64_t>> m_ids;
    std::deque<std::string> m_order; ///< the keys, oldest first
};

} // namespace reportctl::store
