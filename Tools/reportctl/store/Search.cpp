#include "Tools/reportctl/store/Search.h"

#include <SQLiteCpp/Statement.h>
#include <fmt/format.h>
#include <sqlite3.h>

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

std::string TextOf(sqlite3_value* value) {
    const auto* text = reinterpret_cast<const char*>(sqlite3_value_text(value)); // NULL is an empty text
    return text == nullptr ? std::string()
                           : std::string(text, static_cast<std::size_t>(sqlite3_value_bytes(value)));
}

/// SQLite calls this for rows that do not have the text. A row is read once only in this way.
void CallIsWanted(sqlite3_context* context, int, sqlite3_value** values) {
    const auto& isWanted = *static_cast<const IsWanted*>(sqlite3_user_data(context));
    sqlite3_result_int(context, isWanted({TextOf(values[0]), TextOf(values[1]), TextOf(values[2])}) ? 1 : 0);
}

/// `isWanted` must live as long as the statements that use the function.
void AddFunction(SQLite::Database& database, const IsWanted& isWanted) {
    database.createFunction("is_wanted", 3, false, const_cast<IsWanted*>(&isWanted), CallIsWanted);
}

} // namespace

void Search(SQLite::Database& database, const std::string& text, const IsWanted& isWanted,
            const std::function<void(const FoundRow&)>& visit) {
    if (isWanted)
        AddFunction(database, isWanted);
    SQLite::Statement rows(
        database,
        fmt::format("select {} from ({}) where (instr(event, :text) or instr(value, :text) or "
                    "instr(create_time, :text) or instr(openid, :text){}) and id >= :first and id < :end "
                    "order by id",
                    COLUMNS, ReportsSelect(), isWanted ? " or is_wanted(event, value, create_time)" : ""));
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
