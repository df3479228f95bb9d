#include "Tools/reportctl/store/Search.h"

#include <SQLiteCpp/Statement.h>

#include "Tools/reportctl/store/Reports.h"
#include "Tools/reportctl/store/Rows.h"

namespace reportctl::store {

void Search(SQLite::Database& database, const std::string& text,
            const std::function<void(const FoundRow&)>& visit) {
    SQLite::Statement rows(
        database,
        "select id, coalesce(at, ''), coalesce(event, ''), coalesce(value, ''), coalesce(create_time, ''), "
        "coalesce(openid, '') from (" +
            ReportsSelect() +
            ") where (instr(event, :text) or instr(value, :text) or instr(create_time, :text) or "
            "instr(openid, :text)) and id >= :first and id < :end order by id");
    rows.bind(":text", text);
    InPieces(AllIds(database), IDS_AT_ONCE, [&](IdRange piece) {
        rows.reset();
        rows.bind(":first", piece.first);
        rows.bind(":end", piece.end);
        while (rows.executeStep())
            visit({.id = rows.getColumn(0).getInt64(),
                   .at = rows.getColumn(1).getString(),
                   .event = rows.getColumn(2).getString(),
                   .value = rows.getColumn(3).getString(),
                   .createTime = rows.getColumn(4).getString(),
                   .openid = rows.getColumn(5).getString()});
    });
}

std::string OldestTime(SQLite::Database& database) {
    SQLite::Statement row(database,
                          "select coalesce(at, '') from (" + ReportsSelect() + ") order by id limit 1");
    return row.executeStep() ? row.getColumn(0).getString() : std::string();
}

} // namespace reportctl::store
