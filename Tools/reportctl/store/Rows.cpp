#include "Tools/reportctl/store/Rows.h"

#include <algorithm>

#include <fmt/format.h>

namespace reportctl::store {

IdRange AllIds(SQLite::Database& database) {
    // Two inner selects: SQLite finds min or max alone at once, but scans the table for both in one select.
    SQLite::Statement query(database,
                            "select (select min(id) from OperLog), (select max(id) from OperLog) + 1");
    query.executeStep();
    if (query.getColumn(0).isNull())
        return {};
    return {query.getColumn(0).getInt64(), query.getColumn(1).getInt64()};
}

void InPieces(IdRange range, std::int64_t idsAtOnce, const std::function<void(IdRange)>& visit) {
    for (auto first = range.first; first < range.end; first += idsAtOnce)
        visit({first, std::min(first + idsAtOnce, range.end)});
}

SQLite::Statement SelectReports(SQLite::Database& database, const std::string& columns,
                                const ReportFilter& filter, const std::string& rest) {
    SQLite::Statement statement(database,
                                fmt::format("select {} from ({}) where id >= :first and id < :end and {} {}",
                                            columns, ReportsSelect(), filter.Condition(), rest));
    filter.BindTo(statement);
    return statement;
}

void BindPiece(SQLite::Statement& statement, IdRange piece) {
    statement.reset();
    statement.bind(":first", piece.first);
    statement.bind(":end", piece.end);
}

} // namespace reportctl::store
