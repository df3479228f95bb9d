#include "Tools/reportctl/outbox/DeadLetters.h"

#include <algorithm>

#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>
#include <fmt/format.h>

namespace reportctl::outbox {
namespace {

/// The most dead letters of one transaction. With so many, the service's next event waits for a few
/// milliseconds.
constexpr int LETTERS_AT_ONCE = 500;

constexpr auto OLDEST = "select id from dead_letter order by id limit ?1";
constexpr auto WITH_UUID = "select id from dead_letter where uuid = ?1";

/// The uuid stays, because the collector recognises a repeated event by it. The sequence number and the time
/// of storing are new, because the event is stored again.
constexpr auto PUT_BACK = R"sql(
insert into event(uuid, module, release, sequence, event_id, payload, stored_ms, bytes)
    select d.uuid, d.module, d.release,
           m.last_sequence + row_number() over (partition by d.module order by d.id), d.event_id,
           d.payload, cast((julianday('now') - 2440587.5) * 86400000 as integer), d.bytes
    from dead_letter as d join module as m on m.id = d.module where d.id in ({}) order by d.id)sql";

template <typename Argument>
std::int64_t Run(SQLite::Database& database, const std::string& sql, const Argument& argument) {
    SQLite::Statement statement(database, sql);
    statement.bind(1, argument);
    return statement.exec();
}

/// Deletes the dead letters that the query selects, and subtracts them from the sums. Returns how many they
/// were.
template <typename Argument>
std::int64_t Remove(SQLite::Database& database, const std::string& letters, const Argument& argument) {
    Run(database,
        fmt::format("update totals set dead_letters = max(dead_letters - n, 0), "
                    "dead_letter_bytes = max(dead_letter_bytes - b, 0) from "
                    "(select count(*) as n, coalesce(sum(bytes), 0) as b from dead_letter where id in ({}))",
                    letters),
        argument);
    return Run(database, fmt::format("delete from dead_letter where id in ({})", letters), argument);
}

template <typename Argument>
std::int64_t PutBack(SQLite::Database& database, const std::string& letters, const Argument& argument) {
    SQLite::Transaction transaction(database, SQLite::TransactionBehavior::IMMEDIATE);
    Run(database, fmt::format(PUT_BACK, letters), argument);
    const auto count = Remove(database, letters, argument);
    transaction.commit();
    return count;
}

} // namespace

std::int64_t RetryAll(SQLite::Database& database) {
    // Puts back as many as there are now, the oldest first. Events that the collector refuses again meanwhile
    // are not retried.
    auto left = database.execAndGet("select count(*) from dead_letter").getInt64();
    std::int64_t all = 0;
    for (std::int64_t count = 1; count > 0 && left > 0; left -= count) {
        count = PutBack(database, OLDEST, static_cast<int>(std::min<std::int64_t>(left, LETTERS_AT_ONCE)));
        all += count;
    }
    return all;
}

Retried Retry(SQLite::Database& database, const std::vector<std::string>& uuids) {
    Retried retried;
    for (const auto& uuid : uuids)
        if (const auto count = PutBack(database, WITH_UUID, uuid); count > 0)
            retried.events += count;
        else
            retried.unknown.push_back(uuid);
    return retried;
}

std::int64_t Purge(SQLite::Database& database) {
    std::int64_t all = 0;
    for (std::int64_t count = 1; count > 0; all += count) {
        SQLite::Transaction transaction(database, SQLite::TransactionBehavior::IMMEDIATE);
        count = Remove(database, OLDEST, LETTERS_AT_ONCE);
        transaction.commit();
    }
    return all;
}

} // namespace reportctl::outbox
