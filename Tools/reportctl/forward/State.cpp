#include "Tools/reportctl/forward/State.h"

#include <algorithm>
#include <filesystem>
#include <memory>
#include <stdexcept>
#include <system_error>

#include <Poco/UUIDGenerator.h>
#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>
#include <fcntl.h>
#include <fmt/format.h>
#include <sys/file.h>

#include "Modules/Sqlite/DatabaseFiles.h"
#include "SystemTool/Errno.h"
#include "SystemTool/IO/MakeDirectories.h"
#include "Tools/reportctl/outbox/Database.h"
#include "Tools/reportctl/store/Store.h"
#include "Tools/reportctl/store/Unchanged.h"

namespace reportctl::forward {
namespace {

/// "MFWD".
constexpr int APPLICATION_ID = 0x4d465744;
constexpr int SCHEMA_VERSION = 1;

/// Only this process writes; a person may look with sqlite3 meanwhile. What could not be written is kept in
/// memory.
constexpr int BUSY_TIMEOUT_MS = 1000;

/// Of the rows that were sent last. More of them find a place in an older copy of the store.
constexpr int MOST_ANCHORS = 32;

constexpr auto TABLES = R"sql(
create table place(
    id           integer primary key check (id = 1),
    installation text    not null,
    position     integer,
    forwarded    integer not null default 0);
create table anchor(
    row integer primary key,
    uid text    not null);
create table held(
    row    integer not null,
    uid    text    not null,
    event  text    not null,
    tries  integer not null,
    reason text    not null,
    primary key (row, uid));
create table refused(
    id        integer primary key,
    first_row integer not null,
    last_row  integer not null,
    rows      integer not null,
    uid       text    not null,
    event     text    not null,
    status    integer not null,
    reason    text    not null,
    at        text    not null default (strftime('%Y-%m-%dT%H:%M:%fZ', 'now')));
)sql";

std::string InstallationOf(const std::string& outbox) {
    try {
        auto database = outbox::OpenToLook(outbox);
        return database.execAndGet("select outbox_id from totals").getString();
    } catch (const std::exception&) { // there is none, or none that can be read
        return Poco::UUIDGenerator::defaultGenerator().createRandom().toString();
    }
}

void RequireOurs(SQLite::Database& database, const std::string& path) {
    if (database.execAndGet("pragma application_id").getInt() != APPLICATION_ID ||
        database.execAndGet("pragma user_version").getInt() != SCHEMA_VERSION)
        throw std::runtime_error(fmt::format("{} is none of this program's, or of another version's. Move it "
                                             "away, and every row is sent again.",
                                             path));
}

Place PlaceIn(SQLite::Database& database) {
    Place place;
    SQLite::Statement row(database, "select installation, position from place");
    if (!row.executeStep())
        throw std::runtime_error("the file that tells how far the store was sent has lost its row");
    place.installation = row.getColumn(0).getString();
    if (!row.getColumn(1).isNull())
        place.position = row.getColumn(1).getInt64();
    SQLite::Statement anchors(database, "select row, uid from anchor order by row desc");
    while (anchors.executeStep())
        place.anchors.push_back({anchors.getColumn(0).getInt64(), anchors.getColumn(1).getString()});
    return place;
}

} // namespace

State::State(const std::string& path, const std::string& outbox) {
    const auto directory = std::filesystem::path(path).parent_path().string();
    if (const auto failure = SystemTool::IO::MakeDirectories(directory))
        SystemTool::ThrowErrno("cannot make " + failure.path, failure.error);
    Sqlite::RequireOurFiles(path);
    Lock(path);
    store::Naming(path, [&] { Open(path, outbox); });
}

void State::Open(const std::string& path, const std::string& outbox) {
    m_database = std::make_unique<SQLite::Database>(path, SQLite::OPEN_READWRITE, BUSY_TIMEOUT_MS);
    if (m_database->execAndGet("select count(*) from sqlite_master").getInt() == 0)
        MakeTables(outbox);
    RequireOurs(*m_database, path);
    ReadPlace();
}

Place State::LookAt(const std::string& path) {
    std::error_code error;
    const auto size = std::filesystem::file_size(path, error);
    if (error == std::errc::no_such_file_or_directory || (!error && size == 0))
        return {};
    if (error)
        throw std::system_error(error, "cannot look at " + path);
    return store::Naming(path, [&] {
        auto database = store::OpenUnchanged(path);
        RequireOurs(database, path);
        return PlaceIn(database);
    });
}

/// The lock is the file's own and not SQLite's, which lasts for a statement or a transaction.
void State::Lock(const std::string& path) {
    constexpr mode_t PRIVATE_FILE = 0600;
    m_lock = SystemTool::IO::Descriptor(
        ::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, PRIVATE_FILE));
    if (!m_lock.IsOpen())
        SystemTool::ThrowErrno("cannot open " + path);
    if (::flock(m_lock.Number(), LOCK_EX | LOCK_NB) != 0)
        throw std::runtime_error("another `reportctl forward` is at work; this one did nothing");
}

void State::MakeTables(const std::string& outbox) {
    SQLite::Transaction transaction(*m_database, SQLite::TransactionBehavior::IMMEDIATE);
    m_database->exec(TABLES);
    m_database->exec(fmt::format("pragma application_id = {}", APPLICATION_ID));
    m_database->exec(fmt::format("pragma user_version = {}", SCHEMA_VERSION));
    SQLite::Statement insert(*m_database, "insert into place(id, installation) values (1, ?)");
    insert.bind(1, InstallationOf(outbox));
    insert.exec();
    transaction.commit();
}

void State::ReadPlace() {
    m_place = PlaceIn(*m_database);
}

std::vector<HeldRow> State::Held(std::size_t max) {
    SQLite::Statement query(*m_database,
                            "select row, uid, event, tries, reason from held order by rowid limit ?");
    query.bind(1, static_cast<std::int64_t>(max));
    std::vector<HeldRow> held;
    while (query.executeStep())
        held.push_back({{query.getColumn(0).getInt64(), query.getColumn(1).getString()},
                        query.getColumn(2).getString(),
                        query.getColumn(3).getInt(),
                        query.getColumn(4).getString()});
    return held;
}

Totals State::Sums() {
    SQLite::Statement sums(*m_database, "select forwarded, (select count(*) from held), "
                                        "(select coalesce(sum(rows), 0) from refused) from place");
    sums.executeStep();
    return {sums.getColumn(0).getInt64(), sums.getColumn(1).getInt64(), sums.getColumn(2).getInt64()};
}

void State::Commit(const Change& change) {
    store::Naming(m_database->getFilename(), [&] { Write(change); });
    ReadPlace();
}

void State::Write(const Change& change) {
    SQLite::Transaction transaction(*m_database, SQLite::TransactionBehavior::IMMEDIATE);
    for (const auto& held : change.held)
        Hold(held);
    for (const auto& row : change.sent)
        Release(row);
    for (const auto& refused : change.refused)
        Refuse(refused);
    Run("update place set forwarded = forwarded + ?", change.forwarded);
    MoveTo(change);
    transaction.commit();
}

/// Anchors behind the start of what was sent are of rows that are no more.
void State::MoveTo(const Change& change) {
    if (change.position == m_place.position && change.from == change.position)
        return;
    Run("delete from anchor where row > ?", change.from);
    Run("update place set position = ?", change.position);
    const auto last = std::max_element(change.sent.begin(), change.sent.end(),
                                       [](const Anchor& a, const Anchor& b) { return a.row < b.row; });
    if (last != change.sent.end()) {
        SQLite::Statement insert(*m_database, "insert or replace into anchor(row, uid) values (?, ?)");
        insert.bind(1, last->row);
        insert.bind(2, last->uid);
        insert.exec();
    }
    Run("delete from anchor where row <= (select row from anchor order by row desc limit 1 offset ?)",
        MOST_ANCHORS);
}

void State::Hold(const HeldRow& held) {
    SQLite::Statement insert(*m_database,
                             "insert into held(row, uid, event, tries, reason) values (?, ?, ?, ?, ?) "
                             "on conflict do update set tries = excluded.tries, reason = excluded.reason");
    insert.bind(1, held.row.row);
    insert.bind(2, held.row.uid);
    insert.bind(3, held.event);
    insert.bind(4, held.tries);
    insert.bind(5, held.reason);
    insert.exec();
}

void State::Release(const Anchor& row) {
    SQLite::Statement remove(*m_database, "delete from held where row = ? and uid = ?");
    remove.bind(1, row.row);
    remove.bind(2, row.uid);
    remove.exec();
}

void State::Refuse(const RefusedRows& refused) {
    Release({refused.first, refused.uid});
    SQLite::Statement insert(*m_database,
                             "insert into refused(first_row, last_row, rows, uid, event, status, reason) "
                             "values (?, ?, ?, ?, ?, ?, ?)");
    insert.bind(1, refused.first);
    insert.bind(2, refused.last);
    insert.bind(3, refused.count);
    insert.bind(4, refused.uid);
    insert.bind(5, refused.event);
    insert.bind(6, static_cast<std::int64_t>(refused.status));
    insert.bind(7, refused.reason);
    insert.exec();
}

/// One statement with one number.
void State::Run(const char* sql, std::int64_t number) {
    SQLite::Statement statement(*m_database, sql);
    statement.bind(1, number);
    statement.exec();
}

} // namespace reportctl::forward
