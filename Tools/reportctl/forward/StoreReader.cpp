#include "Tools/reportctl/forward/StoreReader.h"

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Exception.h>
#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>
#include <sqlite3.h>

#include "Tools/reportctl/store/Store.h"

namespace reportctl::forward {
namespace {

constexpr auto COLUMNS = "select id, eventID, value, createTime, extData3, extData4 from OperLog ";

SQLite::Database Open(const std::string& path, std::size_t maxRowBytes) {
    auto database = store::OpenToRead(path);
    database.exec("pragma query_only = on");
    sqlite3_db_config(database.getHandle(), SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
    sqlite3_limit(database.getHandle(), SQLITE_LIMIT_LENGTH, static_cast<int>(maxRowBytes));
    return database;
}

Row::Text TextOf(const SQLite::Column& column) {
    if (column.isNull())
        return std::nullopt;
    return column.getString();
}

Row RowOf(SQLite::Statement& statement) {
    return {.id = statement.getColumn(0).getInt64(),
            .eventID = TextOf(statement.getColumn(1)),
            .value = TextOf(statement.getColumn(2)),
            .createTime = TextOf(statement.getColumn(3)),
            .suiteVersion = TextOf(statement.getColumn(4)),
            .openid = TextOf(statement.getColumn(5))};
}

std::optional<Row> RowWith(SQLite::Database& database, std::int64_t id) {
    SQLite::Statement statement(database, std::string(COLUMNS) + "where id = ?");
    statement.bind(1, id);
    return statement.executeStep() ? std::optional(RowOf(statement)) : std::nullopt;
}

/// Whether the row is as it was sent; nothing when it is gone.
std::optional<bool> IsAsItWas(SQLite::Database& database, const Place& place, const Anchor& anchor) {
    try {
        const auto row = RowWith(database, anchor.row);
        return row ? std::optional(UidOf(place.installation, *row) == anchor.uid) : std::nullopt;
    } catch (const SQLite::Exception& error) {
        if (error.getErrorCode() == SQLITE_TOOBIG) // no row of this size was ever sent
            return false;
        throw;
    }
}

/// Where the rows begin that were not sent yet. The ids of a store begin again at 1 when all its rows were
/// deleted, and with another store in its place anything is possible; so the rows that were sent last are
/// looked at once more. What is read again without need has its old uids, and what is left out is lost: in
/// doubt, it is read again.
std::int64_t StartIn(SQLite::Database& database, const Place& place) {
    const auto last = database.execAndGet("select max(id) from OperLog");
    if (place.position == Place::BEGINNING || last.isNull())
        return place.position;
    bool isOther = last.getInt64() < place.position;
    for (const auto& anchor : place.anchors) {
        const auto isSame = IsAsItWas(database, place, anchor);
        if (isSame && *isSame)
            return isOther ? anchor.row : place.position;
        isOther = isOther || isSame.has_value();
    }
    return isOther ? Place::BEGINNING : place.position; // else: pruned
}

/// Finds the next row without reading it.
std::optional<std::int64_t> NextId(SQLite::Database& database, std::int64_t after) {
    SQLite::Statement next(database, "select id from OperLog where id > ? order by id limit 1");
    next.bind(1, after);
    return next.executeStep() ? std::optional(next.getColumn(0).getInt64()) : std::nullopt;
}

/// Steps to the next row. False at the end, and at a row that is too large, which is noted in `page`.
bool Step(SQLite::Database& database, SQLite::Statement& statement, std::int64_t before, Page& page) {
    try {
        return statement.executeStep();
    } catch (const SQLite::Exception& error) {
        if (error.getErrorCode() != SQLITE_TOOBIG)
            throw;
        page.tooLarge = NextId(database, before);
        return false;
    }
}

/// Another row may have its id by now.
bool IsAmong(const MetrikSdk::EventKeys& keys, const Place& place, const Row& row) {
    const auto found = keys.find(row.id);
    return found != keys.end() && found->second == UidOf(place.installation, row);
}

Page ReadFrom(SQLite::Database& database, const Place& place, const MetrikSdk::EventKeys& without,
              std::size_t maxRows, std::size_t maxBytes) {
    const SQLite::Transaction oneMoment(database);
    Page page;
    page.from = StartIn(database, place);
    SQLite::Statement statement(database, std::string(COLUMNS) + "where id > ? order by id");
    statement.bind(1, page.from);
    std::size_t bytes = 0;
    for (auto last = page.from; page.rows.size() < maxRows && bytes < maxBytes;) {
        if (!Step(database, statement, last, page))
            break;
        auto row = RowOf(statement);
        last = row.id;
        if (IsAmong(without, place, row))
            continue;
        bytes += BytesOf(row);
        page.rows.push_back(std::move(row));
    }
    return page;
}

} // namespace

Page StoreReader::Read(const Place& place, const MetrikSdk::EventKeys& without, std::size_t maxRows,
                       std::size_t maxBytes) const {
    return store::Naming(m_path, [&] {
        auto database = Open(m_path, m_maxRowBytes);
        return ReadFrom(database, place, without, maxRows, maxBytes);
    });
}

std::optional<Row> StoreReader::ReadOne(const Place& place, const Anchor& row) const {
    return store::Naming(m_path, [&] {
        auto database = Open(m_path, m_maxRowBytes);
        return IsAsItWas(database, place, row).value_or(false) ? RowWith(database, row.row) : std::nullopt;
    });
}

Extent StoreReader::Ahead(const Place& place) const {
    return store::Naming(m_path, [&] {
        auto database = Open(m_path, m_maxRowBytes);
        const SQLite::Transaction oneMoment(database);
        SQLite::Statement statement(
            database,
            "select count(*), coalesce(min(id), 0), coalesce(max(id), 0) from OperLog where id > ?");
        statement.bind(1, StartIn(database, place));
        statement.executeStep();
        return Extent{statement.getColumn(0).getInt64(), statement.getColumn(1).getInt64(),
                      statement.getColumn(2).getInt64()};
    });
}

} // namespace reportctl::forward
