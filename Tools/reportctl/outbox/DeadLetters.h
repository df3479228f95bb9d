#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include <SQLiteCpp/Database.h>

/// What a person may do with dead letters while the service runs. Each change is a transaction of some
/// milliseconds, and leaves the sums of the view outbox_status as they must be.
///
/// Failure: SQLite::Exception; then what was done before stays done, and is whole.
namespace reportctl::outbox {

struct Retried {
    std::int64_t events = 0;
    std::vector<std::string> unknown; ///< ids that no dead letter has
};

/// Puts every dead letter back among the waiting events, under its old uuid and the next sequence numbers of
/// its module.
std::int64_t RetryAll(SQLite::Database& database);

/// The same for these uuids alone.
Retried Retry(SQLite::Database& database, const std::vector<std::string>& uuids);

/// Deletes every dead letter.
std::int64_t Purge(SQLite::Database& database);

} // namespace reportctl::outbox
