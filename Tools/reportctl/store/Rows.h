#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>

#include "Tools/reportctl/store/Reports.h"

namespace reportctl::store {

/// The range of ids that rows may have: from `first` on, `end` excluded.
struct IdRange {
    std::int64_t first = 0;
    std::int64_t end = 0;
};

/// From the first id to the last one that the store has now; an empty range without rows. No scan.
IdRange AllIds(SQLite::Database& database);

/// Calls `visit` with each piece of `range`, in order, each of at most `idsAtOnce` ids.
///
/// A reader keeps SQLite from giving the write-ahead log's space back, so a command that reads the whole
/// store reads it in pieces: each statement is over after some milliseconds.
void InPieces(IdRange range, std::int64_t idsAtOnce, const std::function<void(IdRange)>& visit);

/// The pieces in which a command reads. 50,000 rows are read in about 0.1 s.
inline constexpr std::int64_t IDS_AT_ONCE = 50'000;

/// A statement over the rows of ReportsSelect:
/// `select <columns> from (...) where <filter> and <id in :first..:end> <rest>`.
SQLite::Statement SelectReports(SQLite::Database& database, const std::string& columns,
                                const ReportFilter& filter, const std::string& rest);

/// Prepares that statement for a piece: resets it and binds its ids.
void BindPiece(SQLite::Statement& statement, IdRange piece);

} // namespace reportctl::store
