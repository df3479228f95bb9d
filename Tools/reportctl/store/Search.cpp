#include "Tools/reportctl/store/Search.h"

#include <SQLiteCpp/Statement.h>
#include <fmt/format.h>

#include "Tools/reportctl/store/Reports.h"
#include "Tools/reportctl/store/Rows.h"

namespace reportctl::store {

namespace {

constexpr auto COLUMNS =
    "id, coalesce(at, ''), coalesce(at_local, ''), coalesce(event, ''), coalesce(value, ''), "
    "coalesce(create_time, ''), coalesce(openid, '')";

FoundRow RowOf(SQLite::Statement& rows) {
    return {.id = rows.getColumn(0).getInt64(),
            .at = rows.getColumn(1).getString(),
            .atLocal = rows.getColumn(2).getString(),
            .event = rows.getColumn(3).getString(),
            .value = rows.getColumn(4).getString(),
            .createTime = rows.getColumn(5).getString(),
            .openid = rows.getColumn(6).getString()};
}

} // namespace

void Search(SQLite::Database& database, const std::string& text,
            const std::function<void(const FoundRow&)>& visit) {
    SQLite::Statement rows(
        database,
        fmt::format("select {} from ({}) where (instr(event, :text) or instr(value, :text) or "
                    "instr(create_time, :text) or instr(openid, :text)) and id >= :first and id < :end "
                    "order by id",
                    COLUMNS, ReportsSelect()));
    rows.bind(":text", text);
    InPieces(AllIds(database), IDS_AT_ONCE, [&](IdRange piece) {
        rows.reset();
        rows.bind(":first", piece.first);
        rows.bind(":end", piece.end);
        while (rows.executeStep())
            visit(RowOf(rows));
    });
}

std::optional<FoundRow> OldestRow(SQLite::Database& database) {
    SQLite::Statement row(database,
                          fmt::format("select {} from ({}) order by id limit 1", COLUMNS, ReportsSelect()));
    return row.executeStep() ? std::optional(RowOf(row)) : std::nullopt;
}

} // namespace reportctl::store
