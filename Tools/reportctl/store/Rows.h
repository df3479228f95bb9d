#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>

#include "Tools/reportctl/store/Reports.h"

namespace reportctl::store {

/// A range of row ids: from `first` to before `end`.
struct IdRange {
    std::int64_t first = 0;
    std::int64_t end = 0;
};

/// The range from the first to the last id that the store has now; empty when there are no rows. It reads the
/// two ends only and does not scan the table.
IdRange AllIds(SQLite::Database& database);

/// Divides `range` into pieces of at most `idsAtOnce` ids and calls `visit` with each of them, in order.
///
/// While a statement reads, SQLite cannot use the write-ahead log's space again. So a command that reads the
/// whole store reads it in pieces, and each statement ends after some milliseconds.
void InPieces(IdRange range, std::int64_t idsAtOnce, const std::function<void(IdRange)>& visit);

/// The size of the pieces in which a command reads. It takes about 0.1 s to read 50,000 rows.
inline constexpr std::int64_t IDS_AT_ONCE = 50'000;

/// A statement over the rows of ReportsSelect:
/// `select <columns> from (...) where <filter> and <id in :first..:end> <rest>`.
SQLite::Statement SelectReports(SQLite::Database& database, const std::string& columns,
                                const ReportFilter& filter, const std::string& rest);

/// Prepares a statement of SelectReports for a piece: resets the statement and binds the piece's ids.
void BindPiece(SQLite::Statement& statement, IdRange piece);

} // namespace reportctl::store
