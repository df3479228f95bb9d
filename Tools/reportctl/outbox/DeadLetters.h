#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include <SQLiteCpp/Database.h>

/// Changes to the dead letters, which may be made while the service runs. Each change consists of
/// transactions of some milliseconds. The sums of the view outbox_status stay right.
///
/// Failure: throws SQLite::Exception. The transactions that were committed before stay done.
namespace reportctl::outbox {

struct Retried {
    std::int64_t events = 0;
    std::vector<std::string> unknown; ///< uuids that no dead letter has
};

/// Puts every dead letter back among the waiting events. It keeps its uuid and gets the next sequence number
/// of its module. Returns how many were put back.
std::int64_t RetryAll(SQLite::Database& database);

/// Puts the dead letters with these uuids back, as RetryAll does.
Retried Retry(SQLite::Database& database, const std::vector<std::string>& uuids);

/// Deletes every dead letter. Returns how many were deleted.
std::int64_t Purge(SQLite::Database& database);

} // namespace reportctl::outbox
