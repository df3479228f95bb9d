#include "Tools/reportctl/store/Prune.h"

#include <algorithm>
#include <chrono>
#include <thread>

#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>
#include <fmt/format.h>

#include "Tools/reportctl/store/Reports.h"
#include "Tools/reportctl/store/Rows.h"

namespace reportctl::store {
namespace {

using Clock = std::chrono::steady_clock;

/// The value of `pragma auto_vacuum` of a store whose free pages can be given back a few at a time.
constexpr std::int64_t AUTO_VACUUM_INCREMENTAL = 2;

std::int64_t Ask(SQLite::Database& database, const std::string& query) {
    return database.execAndGet(query).getInt64();
}

std::int64_t BytesOfFile(SQLite::Database& database) {
    return Ask(database, "pragma page_count") * Ask(database, "pragma page_size");
}

std::int64_t BytesInUse(SQLite::Database& database) {
    return BytesOfFile(database) - Ask(database, "pragma freelist_count") * Ask(database, "pragma page_size");
}

std::int64_t CountIn(SQLite::Database& database, IdRange range, const ReportFilter& filter) {
    auto counts = SelectReports(database, "count(*)", filter, "");
    std::int64_t rows = 0;
    InPieces(range, 4 * IDS_AT_ONCE, [&](IdRange piece) {
        BindPiece(counts, piece);
        counts.executeStep();
        rows += counts.getColumn(0).getInt64();
        counts.reset();
    });
    return rows;
}

/// The id of the first row that stays when the oldest `removed` rows are deleted.
std::int64_t IdAfter(SQLite::Database& database, std::int64_t removed) {
    SQLite::Statement query(database, "select id from OperLog order by id limit 1 offset ?");
    query.bind(1, removed);
    return query.executeStep() ? query.getColumn(0).getInt64() : AllIds(database).end;
}

/// How many of the oldest rows must be deleted so that the others fit, if all rows have the same size.
std::int64_t RowsOverSize(SQLite::Database& database, std::int64_t rows, std::int64_t keepBytes) {
    const auto inUse = BytesInUse(database);
    if (inUse <= keepBytes || rows == 0)
        return 0;
    const auto part = double(inUse - keepBytes) / double(inUse);
    return std::clamp(static_cast<std::int64_t>(part * double(rows)) + 1, std::int64_t{1}, rows);
}

/// Runs `work` in a transaction of its own. Then sleeps without the lock for as long as the lock was held, so
/// that the service gets its turn. Returns that time.
Clock::duration InTurn(SQLite::Database& database, const std::function<void()>& work) {
    SQLite::Transaction transaction(database, SQLite::TransactionBehavior::IMMEDIATE);
    const auto begin = Clock::now();
    work();
    transaction.commit();
    const auto held = Clock::now() - begin;
    std::this_thread::sleep_for(held);
    return held;
}

/// The size of the next batch. It moves towards the size that takes the allowed time; one step at most
/// doubles or halves the last size.
std::int64_t NextBatch(std::int64_t last, Clock::duration took, const PruneSettings& settings) {
    const auto allowed = std::chrono::milliseconds(settings.batchMs);
    const double factor =
        double(allowed.count()) * 1e6 / std::max(1.0, double(std::chrono::nanoseconds(took).count()));
    return std::clamp(static_cast<std::int64_t>(double(last) * std::clamp(factor, 0.5, 2.0)), std::int64_t{1},
                      settings.largestBatch);
}

std::string DeleteStatement(const PruneRule& rule) {
    const std::string ids = "delete from OperLog where id >= :first and id < :end";
    return rule.olderThanMs ? fmt::format("{} and {} < :before", ids, TimeOf("createTime")) : ids;
}

/// Deletes from the rows before `plan.endId`, oldest first.
class Deletion {
public:
    Deletion(SQLite::Database& database, const PruneRule& rule, const PruneSettings& settings)
        : m_database(database), m_rule(rule), m_settings(settings), m_batch(settings.firstBatch),
          m_delete(database, DeleteStatement(rule)) {
        if (rule.olderThanMs)
            m_delete.bind(":before", *rule.olderThanMs);
    }

    std::int64_t Run(IdRange ids, const std::function<void(std::int64_t, std::int64_t)>& progress) {
        std::int64_t removed = 0;
        for (auto first = ids.first; first < ids.end && !IsEnough();) {
            const IdRange piece{first, first + std::min(m_batch, MostFrom({first, ids.end}))};
            const auto took = InTurn(m_database, [&] {
                BindPiece(m_delete, piece);
                removed += m_delete.exec();
            });
            m_batch = NextBatch(m_batch, took, m_settings);
            first = piece.end;
            progress(first - ids.first, ids.end - ids.first);
        }
        return removed;
    }

private:
    /// With keepBytes, the deletion ends as soon as the other rows fit, because the plan was only an
    /// estimate.
    bool IsEnough() { return m_rule.keepBytes && BytesInUse(m_database) <= *m_rule.keepBytes; }

    /// The most ids that the next batch may take. With keepBytes, it is the number of rows that are too many
    /// if all rows have the same size.
    std::int64_t MostFrom(IdRange left) {
        const auto ids = left.end - left.first;
        return m_rule.keepBytes ? RowsOverSize(m_database, ids, *m_rule.keepBytes) : ids;
    }

    SQLite::Database& m_database;
    const PruneRule& m_rule;
    const PruneSettings& m_settings;
    std::int64_t m_batch;
    SQLite::Statement m_delete;
};

/// Moves pages from the file's end into free pages, a few at a time, and so makes the file shorter.
void GiveSpaceBack(SQLite::Database& database, const PruneSettings& settings) {
    std::int64_t pages = 16;
    while (Ask(database, "pragma freelist_count") > 0) {
        const auto before = Ask(database, "pragma freelist_count");
        const auto took =
            InTurn(database, [&] { database.exec(fmt::format("pragma incremental_vacuum({})", pages)); });
        if (Ask(database, "pragma freelist_count") >= before)
            return; // other programs free pages as fast as we give them back
        pages = NextBatch(pages, took, settings);
    }
}

/// Merges the write-ahead log into the file, which makes the file shorter. It needs a moment in which no
/// other program uses the log. When there is none, the service's next merge does the rest. We do not use a
/// checkpoint that waits for the writers: it would make other writers wait for the disk.
void MergeLog(SQLite::Database& database) {
    constexpr auto PATIENCE = std::chrono::seconds(2);
    constexpr auto BETWEEN_TRIES = std::chrono::milliseconds(20);
    for (const auto end = Clock::now() + PATIENCE; Clock::now() < end;
         std::this_thread::sleep_for(BETWEEN_TRIES)) {
        SQLite::Statement checkpoint(database, "pragma wal_checkpoint(passive)");
        checkpoint.executeStep();
        if (checkpoint.getColumn(1).getInt() == checkpoint.getColumn(2).getInt())
            return; // all of the log's pages are in the file
    }
}

} // namespace

PrunePlan PlanPrune(SQLite::Database& database, const PruneRule& rule) {
    const auto ids = AllIds(database);
    PrunePlan plan{.rows = CountIn(database, ids, {}), .removed = 0, .endId = ids.end};
    if (rule.olderThanMs) {
        plan.removed =
            CountIn(database, ids, {.sinceMs = {}, .untilMs = rule.olderThanMs, .eventPrefix = {}});
        return plan;
    }
    if (rule.keepBytes) { // endId stays the end: only the deletion itself shows how many rows must be deleted
        plan.removed = RowsOverSize(database, plan.rows, *rule.keepBytes);
        return plan;
    }
    plan.removed = std::max(std::int64_t{0}, plan.rows - *rule.keepRows);
    plan.endId = IdAfter(database, plan.removed);
    return plan;
}

PruneResult Prune(SQLite::Database& database, const PruneRule& rule, const PrunePlan& plan,
                  const PruneSettings& settings,
                  const std::function<void(std::int64_t done, std::int64_t total)>& progress) {
    PruneResult result;
    result.bytesBefore = BytesOfFile(database);
    result.canShrink = Ask(database, "pragma auto_vacuum") == AUTO_VACUUM_INCREMENTAL;
    if (plan.removed > 0)
        result.removed =
            Deletion(database, rule, settings).Run({AllIds(database).first, plan.endId}, progress);
    if (result.canShrink)
        GiveSpaceBack(database, settings);
    MergeLog(database);
    result.bytesAfter = BytesOfFile(database);
    return result;
}

} // namespace reportctl::store
