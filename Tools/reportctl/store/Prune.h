#pragma once

#include <cstdint>
#include <functional>
#include <optional>

#include <SQLiteCpp/Database.h>

namespace reportctl::store {

/// Which rows are deleted. Exactly one of the three is set.
struct PruneRule {
    /// Delete the rows whose time is before this, in milliseconds since 1970.
    std::optional<std::int64_t> olderThanMs;
    /// Keep so many rows, the newest by their ids, and delete all others.
    std::optional<std::int64_t> keepRows;
    /// Delete the oldest rows, by their ids, until the others need no more than so many bytes.
    std::optional<std::int64_t> keepBytes;
};

/// The effect of a rule on a store as it is now.
struct PrunePlan {
    std::int64_t rows = 0;    ///< how many rows the store has
    std::int64_t removed = 0; ///< how many rows would be deleted; for keepBytes an estimate by the mean row
    std::int64_t endId = 0;   ///< rows with this id or a greater one stay
};

/// The limits of one step: how long the service may have to wait, and how much memory and disk it may need.
struct PruneSettings {
    /// The time that a transaction shall take, in milliseconds. It holds the write lock, and the service's
    /// statements wait for it. For comparison: the service's own groups hold the lock for 10 ms.
    std::int64_t batchMs = 5;
    /// How many rows the first batch has. Each further batch is made as large as batchMs allows.
    std::int64_t firstBatch = 200;
    std::int64_t largestBatch = 20'000;
};

/// What Prune did.
struct PruneResult {
    std::int64_t removed = 0;
    std::int64_t bytesBefore = 0; ///< the size of Report.db before
    /// The size of Report.db after the write-ahead log is merged. With a busy service, that may be a little
    /// later.
    std::int64_t bytesAfter = 0;
    bool canShrink = true; ///< false: the file keeps its size, and later rows use the free space in it
};

/// Finds out the effect of a rule. Reads the whole store and changes nothing.
PrunePlan PlanPrune(SQLite::Database& database, const PruneRule& rule);

/// Deletes the rows of the plan in short transactions, and gives the space back to the disk in further short
/// transactions. After each transaction, the lock is free for as long as it was held. `progress` is called
/// with the number of ids that are done and the number of all ids.
///
/// After a failure or a kill, the transactions that were committed stay done, and the store is sound. Calling
/// it again does the rest.
PruneResult Prune(SQLite::Database& database, const PruneRule& rule, const PrunePlan& plan,
                  const PruneSettings& settings,
                  const std::function<void(std::int64_t done, std::int64_t total)>& progress);

} // namespace reportctl::store
