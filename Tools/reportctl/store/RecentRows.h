#pragma once

#include <cstddef>
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

/// The content that the row of a report gets. The service puts texts into its SQL as they are, where two
/// quotes stand for one.
RowContent AsStored(const RowContent& report);

/// Two equal contents have the same hash.
std::size_t HashOf(const RowContent& content);

/// Finds the newest rows of the store by their content. Each row is found once only, so two equal reports
/// need two rows.
///
/// Memory: about 50 bytes for each row. Only a hash of 64 bits is kept of a row. Two different reports have
/// the same hash in about one of ten million searches of a whole log.
///
/// One thread. Failure: ReadNew throws SQLite::Exception, and std::runtime_error when the store is missing.
class RecentRows {
public:
    explicit RecentRows(std::string path) : m_path(std::move(path)) {}

    /// Reads the rows that were added since the last call. The first call reads the last `before` rows.
    void ReadNew(std::int64_t before);

    /// Finds the row that the service makes of this report, and removes it from this object. Returns whether
    /// there was one.
    bool Take(const RowContent& report);

private:
    using Hash = std::size_t;

    void Add(Hash row);
    bool Remove(Hash row);

    std::string m_path;
    std::int64_t m_lastId = -1; ///< -1: nothing was read yet
    std::unordered_map<Hash, std::uint32_t> m_rows;
    std::deque<Hash> m_order; ///< oldest first
};

} // namespace reportctl::store
