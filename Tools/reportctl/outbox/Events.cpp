#include "Tools/reportctl/outbox/Events.h"

#include <SQLiteCpp/Statement.h>

namespace reportctl::outbox {
namespace {

constexpr auto SELECT_WAITING =
    "select e.id, e.uuid, m.module_id, e.sequence, e.event_id, e.payload, e.stored_ms, e.bytes, 0, '' "
    "from event as e join module as m on m.id = e.module where e.id > ? order by e.id";
constexpr auto SELECT_DEAD =
    "select d.id, d.uuid, m.module_id, d.sequence, d.event_id, d.payload, d.stored_ms, d.bytes, d.status, "
    "d.reason "
    "from dead_letter as d join module as m on m.id = d.module where d.id > ? order by d.id";

} // namespace

void ForEach(SQLite::Database& database, Where where, std::int64_t afterRow,
             const std::function<void(const Event&)>& visit) {
    SQLite::Statement rows(database, where == Where::Dead ? SELECT_DEAD : SELECT_WAITING);
    rows.bind(1, afterRow);
    while (rows.executeStep())
        visit({.row = rows.getColumn(0).getInt64(),
               .uuid = rows.getColumn(1).getString(),
               .module = rows.getColumn(2).getString(),
               .sequence = rows.getColumn(3).getInt64(),
               .eventID = rows.getColumn(4).getString(),
               .payload = rows.getColumn(5).getString(),
               .storedMs = rows.getColumn(6).getInt64(),
               .bytes = rows.getColumn(7).getInt64(),
               .isDead = where == Where::Dead,
               .status = rows.getColumn(8).getInt64(),
               .reason = rows.getColumn(9).getString()});
}

std::int64_t LastRow(SQLite::Database& database, Where where) {
    return database
        .execAndGet(where == Where::Dead ? "select coalesce(max(id), 0) from dead_letter"
                                         : "select coalesce(max(id), 0) from event")
        .getInt64();
}

std::map<std::string, std::int64_t> StoredByModule(SQLite::Database& database) {
    std::map<std::string, std::int64_t> stored;
    SQLite::Statement rows(database, "select module_id, last_sequence from module");
    while (rows.executeStep())
        stored[rows.getColumn(0).getString()] = rows.getColumn(1).getInt64();
    return stored;
}

} // namespace reportctl::outbox
