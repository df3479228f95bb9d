#pragma once

#include <cstdint>
#include <functional>
#include <optional>

#include <SQLiteCpp/Database.h>

namespace reportctl::store {

/// What may go. One of the three is set.
struct PruneRule {
    std::optional<std::int64_t> olderThanMs; ///< rows whose time is before this, in milliseconds since 1970
    std::optional<std::int64_t> keepRows;    ///< all but the newest so many rows, by their ids
    std::optional<std::int64_t>
        keepBytes; ///< the oldest rows, by their ids, until the others take so many bytes
};

/// What a rule means for a store as it is now.
struct PrunePlan {
    std::int64_t rows = 0;    ///< that the store has
    std::int64_t removed = 0; ///< that would go; an estimate by the mean row for PruneRule::keepBytes
    std::int64_t endId = 0;   ///< rows with this id or a greater one stay
};

/// How much the service may be kept waiting, and how much memory and disk one step may take.
struct PruneSettings {
    /// A transaction holds the write lock; the service's statements wait meanwhile. Its own groups hold the
    /// lock for 10 ms.
    std::int64_t batchMs = 5;
    /// Rows of the first batch. The next ones are as large as their time allows.
    std::int64_t firstBatch = 200;
    std::int64_t largestBatch = 20'000;
};

/// What was done.
struct PruneResult {
    std::int64_t removed = 0;
    std::int64_t bytesBefore = 0; ///< of Report.db
    std::int64_t bytesAfter =
        0; ///< Once the write-ahead log is merged, which a busy service may do a little later.
    bool canShrink = true; ///< false: the file keeps its size, and the space is used by the rows to come
};

/// Reads the whole store, in pieces; changes nothing.
PrunePlan PlanPrune(SQLite::Database& database, const PruneRule& rule);

/// Deletes the rows of the plan in short transactions and gives the space back in further ones. Between two
/// of them the lock is free for as long as it was held. `progress` is called with the ids that are done and
/// the ids there are.
///
/// After a failure or a kill, what was committed stays done and the store is sound; doing it again does the
/// rest.
PruneResult Prune(SQLite::Database& database, const PruneRule& rule, const PrunePlan& plan,
                  const PruneSettings& settings,
                  const std::function<void(std::int64_t done, std::int64_t total)>& progress);

} // namespace reportctl::store
