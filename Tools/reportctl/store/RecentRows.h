#pragma once

#include <cstdint>
#include <deque>
#include <string>
#include <unordered_map>

namespace reportctl::store {

/// The parts of a report that its row in the store holds.
struct RowContent {
    std::string eventID;
    std::string value;
    std::string createTime;
};

/// Finds the newest rows of the store by their content. Each row is found once only, so two equal reports
/// need two rows.
///
/// One thread. Failure: ReadNew throws SQLite::Exception, and std::runtime_error when the store is missing.
class RecentRows {
public:
    explicit RecentRows(std::string path) : m_path(std::move(path)) {}

    /// Reads the rows that were added since the last call. The first call reads the last `before` rows.
    void ReadNew(std::int64_t before);

    /// Finds the row that the service makes of this report, and removes it from this object. Returns the
    /// row's id, or 0 when there is no such row.
    std::int64_t Take(const RowContent& report);

private:
    void Add(std::int64_t id, std::string key);

    std::string m_path;
    std::int64_t m_lastId = -1; ///< -1: nothing was read yet
    std::unordered_map<std::string, std::deque<std::int64_t>> m_ids;
    std::deque<std::string> m_order; ///< the keys, oldest first
};

} // namespace reportctl::store
