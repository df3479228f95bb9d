#include "Modules/MetrikSdk/outbox/OutboxStore.h"

#include <algorithm>
#include <utility>

#include <sqlite3.h>

#include "Modules/MetrikSdk/outbox/OutboxSchema.h"
#include "Modules/MetrikSdk/outbox/PruneRule.h"
#include "Modules/MetrikSdk/outbox/SqliteGuard.h"
#include "Modules/MetrikSdk/outbox/Uuid.h"
#include "Modules/Sqlite/DeletedLog.h"
#include "Modules/Sqlite/DirectoryVfs.h"

namespace MetrikSdk::outbox {
namespace {

/// How many modules' keys are kept in memory. With more modules, the keys are forgotten and looked up again.
constexpr std::size_t MAX_KNOWN_MODULES = 1000;

/// How many modules are forgotten in one transaction. That takes some milliseconds of one call.
constexpr std::int64_t MAX_FORGOTTEN_AT_ONCE = 1000;

constexpr const char* NEWEST_RELEASE = "SELECT coalesce(max(id), 0) FROM module_release";

/// What the rows of a module take, by the same estimate as in the view. For a module that the file knows by
/// another version, it is a little too much.
std::size_t BytesOf(const ModuleIdentity& module) {
    const auto cost = [](std::size_t octets) { return 150 + 3 * octets + (octets > 200 ? 1024U : 0U); };
    return cost(module.id.size()) + cost(module.version.size() + module.name.size());
}

/// The columns in the order in which AddTo reads them.
constexpr const char* SELECT_EVENT =
    "SELECT id, uuid, release, sequence, event_id, payload, stored_ms, bytes FROM event ";

std::int64_t Number(SQLite::Database& database, const char* query) {
    return database.execAndGet(query).getInt64();
}

SQLite::Database OpenDatabase(const std::string& path) {
    return Guarded("Cannot open the outbox", [&] {
        return SQLite::Database(path, SQLite::OPEN_READWRITE | SQLite::OPEN_NOMUTEX | SQLite::OPEN_NOFOLLOW,
                                0, Sqlite::DirectoryVfs());
    });
}

} // namespace

OutboxStore::OutboxStore(const std::string& path, std::chrono::milliseconds lockPatience, int directory)
    : m_database(OpenDatabase(path)), m_sideFiles(path) {
    SetLockPatience(lockPatience);
    KeepLogOnClose(true); // until the file is known to be sound
    Guarded("Cannot open the outbox", [&] {
        Configure();
        CreateOrCheckSchema();
        m_insert = std::make_unique<SQLite::Statement>(
            m_database,
            "INSERT INTO event(uuid, module, release, sequence, event_id, payload, stored_ms, bytes) "
            "SELECT ?1, m.id, r.id, last_sequence + 1, ?4, ?5, ?6, ?7 FROM module AS m "
            "JOIN module_release AS r ON r.id = ?3 AND r.module = m.id WHERE m.id = ?2");
        m_oldest = std::make_unique<SQLite::Statement>(m_database,
                                                       std::string(SELECT_EVENT) + "ORDER BY id LIMIT ?1");
        m_delete =
            std::make_unique<SQLite::Statement>(m_database, "DELETE FROM event WHERE id = ?1 AND uuid = ?2");
    });
    KeepLogOnClose(false);
    const bool hasDirectory = directory != AT_FDCWD;
    m_sideFiles = Sqlite::SideFileWatch(hasDirectory ? path.substr(path.rfind('/') + 1) : path, directory);
}

bool OutboxStore::InTransaction() {
    return ::sqlite3_get_autocommit(m_database.getHandle()) == 0;
}

bool OutboxStore::Rescue() {
    return Sqlite::RescueDeletedLog(m_database.getHandle(), m_sideFiles);
}

void OutboxStore::Configure() {
    // Each event writes two pages into the log. Small pages take less of the disk's time: on a busy disk, an
    // event takes 17 us with 1 KiB, and 50 us with the usual 4 KiB.
    m_database.exec("PRAGMA page_size = 1024");
    m_database.exec("PRAGMA journal_mode = WAL");
    // FULL would sync the disk at each commit. The figures are in docs/Outbox.md.
    m_database.exec("PRAGMA synchronous = NORMAL");
    m_database.exec("PRAGMA journal_size_limit = 16777216"); // gives the disk space of a burst's log back
    m_database.exec("PRAGMA temp_store = MEMORY");           // SQLite writes no files elsewhere
    m_database.exec("PRAGMA trusted_schema = OFF");          // another file may have taken the place of ours
}

bool OutboxStore::IsOutbox() {
    return Number(m_database, "PRAGMA application_id") == APPLICATION_ID &&
           Number(m_database, "PRAGMA user_version") == SCHEMA_VERSION &&
           Number(m_database, "SELECT count(*) FROM totals") == 1;
}

void OutboxStore::CreateOrCheckSchema() {
    if (IsOutbox()) // a read finds this out, so the opening need not wait for another process's write lock
        return;
    WriteTransaction transaction(m_database);
    const auto version = Number(m_database, "PRAGMA user_version");
    const auto objects = Number(m_database, "SELECT count(*) FROM sqlite_schema");
    if (version == 0 && objects == 0) {
        m_database.exec(TABLES);
        m_database.exec(TRIGGER_AND_VIEW);
        m_database.exec("PRAGMA application_id = " + std::to_string(APPLICATION_ID));
        m_database.exec("PRAGMA user_version = " + std::to_string(SCHEMA_VERSION));
        SQLite::Statement totals(m_database, "INSERT INTO totals(id, outbox_id) VALUES(1, ?1)");
        totals.bind(1, NewUuid(WallNow()));
        totals.exec();
        transaction.Commit();
    } else if (Number(m_database, "PRAGMA application_id") == APPLICATION_ID && version == 1) {
        m_database.exec(MIGRATION);
        m_database.exec(TRIGGER_AND_VIEW);
        m_database.exec("PRAGMA user_version = " + std::to_string(SCHEMA_VERSION));
        transaction.Commit();
    } else if (Number(m_database, "PRAGMA application_id") != APPLICATION_ID || version != SCHEMA_VERSION) {
        throw StoreError(StoreFault::SetAside, "The file is a database, but no outbox of this version");
    } else if (Number(m_database, "SELECT count(*) FROM totals") != 1) {
        throw StoreError(StoreFault::SetAside, "The outbox has lost its totals");
    }
}

void OutboxStore::SetLockPatience(std::chrono::milliseconds patience) {
    ::sqlite3_busy_timeout(m_database.getHandle(), static_cast<int>(patience.count()));
}

void OutboxStore::KeepLogOnClose(bool keep) {
    ::sqlite3_db_config(m_database.getHandle(), SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, keep ? 1 : 0, nullptr);
}

std::size_t OutboxStore::Store(const ModuleIdentity& module, const NewEvent& event) {
    return Guarded("Cannot store an event", [&] {
        const auto keys = KeysOf(module);
        const auto bytes = PruneRule::BytesOf(event);
        const Use insert(*m_insert);
        insert->bindNoCopy(1, event.uuid);
        insert->bind(2, keys.module);
        insert->bind(3, keys.release);
        insert->bindNoCopy(4, event.eventId);
        insert->bindNoCopy(5, event.payload);
        insert->bind(6, static_cast<std::int64_t>(event.storedAt.time_since_epoch().count()));
        insert->bind(7, static_cast<std::int64_t>(bytes));
        // No row was inserted: another program has deleted the module, and perhaps more.
        if (insert->exec() != 1)
            throw StoreError(StoreFault::Reopen, "The outbox has lost a module");
        ForgetVictimBefore(m_database.getLastInsertRowid());
        return bytes + keys.newBytes;
    });
}

OutboxStore::ReleaseKeys OutboxStore::KeysOf(const ModuleIdentity& module) {
    if (const auto known = m_keys.find(module); known != m_keys.end())
        return known->second;
    if (m_keys.size() >= MAX_KNOWN_MODULES)
        m_keys.clear();
    const auto keys = AddRelease(module);
    m_keys.emplace(module, ReleaseKeys{keys.module, keys.release});
    return keys;
}

OutboxStore::ReleaseKeys OutboxStore::AddRelease(const ModuleIdentity& module) {
    WriteTransaction transaction(m_database);
    const auto newest = Number(m_database, NEWEST_RELEASE);
    SQLite::Statement addModule(m_database, "INSERT INTO module(module_id) VALUES(?1) "
                                            "ON CONFLICT DO UPDATE SET module_id = ?1 RETURNING id");
    addModule.bindNoCopy(1, module.id);
    addModule.executeStep();
    ReleaseKeys keys{addModule.getColumn(0).getInt64(), 0};
    addModule.reset();
    SQLite::Statement addRelease(m_database,
                                 "INSERT INTO module_release(module, version, name) VALUES(?1, ?2, ?3) "
                                 "ON CONFLICT DO UPDATE SET name = ?3 RETURNING id");
    addRelease.bind(1, keys.module);
    addRelease.bindNoCopy(2, module.version);
    addRelease.bindNoCopy(3, module.name);
    addRelease.executeStep();
    keys.release = addRelease.getColumn(0).getInt64();
    addRelease.reset();
    transaction.Commit();
    if (keys.release > newest)
        keys.newBytes = BytesOf(module);
    return keys;
}

ModuleIdentity OutboxStore::IdentityOf(std::int64_t release) {
    SQLite::Statement query(m_database, "SELECT module_id, version, name FROM module_release AS r "
                                        "JOIN module AS m ON m.id = r.module WHERE r.id = ?1");
    query.bind(1, release);
    if (!query.executeStep())
        throw StoreError(StoreFault::SetAside, "The outbox has an event of no module");
    return {query.getColumn(0).getString(), query.getColumn(1).getString(), query.getColumn(2).getString()};
}

Batch OutboxStore::Oldest(std::size_t maxEvents, std::size_t maxBytes, const EventKeys& without) {
    return Guarded("Cannot read the outbox", [&] {
        Batch batch;
        std::size_t bytes = 0;
        const Use oldest(*m_oldest);
        oldest->bind(1, static_cast<std::int64_t>(maxEvents + without.size()));
        while (batch.events.size() < maxEvents && bytes < maxBytes && oldest->executeStep()) {
            const auto left = without.find(oldest->getColumn(0).getInt64());
            if (left == without.end() || left->second != oldest->getColumn(1).getString())
                bytes += AddTo(batch, *oldest.operator->());
        }
        return batch;
    });
}

Batch OutboxStore::One(const EventKey& key) {
    return Guarded("Cannot read the outbox", [&] {
        Batch batch;
        SQLite::Statement one(m_database, std::string(SELECT_EVENT) + "WHERE id = ?1 AND uuid = ?2");
        one.bind(1, key.row);
        one.bindNoCopy(2, key.uuid);
        if (one.executeStep())
            AddTo(batch, one);
        return batch;
    });
}

/// Returns how many bytes the event counts.
std::size_t OutboxStore::AddTo(Batch& batch, const SQLite::Statement& row) {
    StoredEvent event{row.getColumn(0).getInt64(),
                      row.getColumn(1).getString(),
                      row.getColumn(2).getInt64(),
                      row.getColumn(3).getInt64(),
                      row.getColumn(4).getString(),
                      row.getColumn(5).getString(),
                      WallTime(std::chrono::milliseconds(row.getColumn(6).getInt64())),
                      static_cast<std::size_t>(row.getColumn(7).getInt64())};
    if (!batch.releases.contains(event.release))
        batch.releases.emplace(event.release, IdentityOf(event.release));
    if (batch.outboxId.empty())
        batch.outboxId = m_database.execAndGet("SELECT outbox_id FROM totals").getString();
    batch.events.push_back(std::move(event));
    return batch.events.back().bytes;
}

bool OutboxStore::Delete(const StoredEvent& event) {
    const Use statement(*m_delete);
    statement->bind(1, event.row);
    statement->bindNoCopy(2, event.uuid);
    return statement->exec() == 1;
}

/// Call this in the transaction that removed events. It forgets modules without waiting events when there are
/// too many, those with the fewest events first: so a flood of modules does not push out a module that
/// reports every day. The newest module is kept, so that its key is not given out twice: another process may
/// know the key.
void OutboxStore::ForgetIdleModules() {
    if (Number(m_database, "SELECT EXISTS (SELECT 1 FROM event)") ==
        0) { // the next events get low rows again
        m_database.exec("UPDATE module SET last_event = 0 WHERE last_event > 0");
        m_lastVictim = 0;
    }
    const auto excess = Number(m_database, "SELECT count(*) FROM module") - MAX_IDLE_MODULES;
    if (excess <= 0)
        return;
    m_database.exec("CREATE TEMP TABLE IF NOT EXISTS idle(id INTEGER PRIMARY KEY); DELETE FROM idle");
    SQLite::Statement find(
        m_database,
        "INSERT INTO idle SELECT id FROM module AS m "
        "WHERE last_event < (SELECT coalesce(min(id), 9223372036854775807) FROM event) "
        "AND id < (SELECT max(id) FROM module) "
        "AND id != (SELECT module FROM module_release ORDER BY id DESC LIMIT 1) "
        "AND NOT EXISTS (SELECT 1 FROM dead_letter WHERE module = m.id) ORDER BY last_sequence, id LIMIT ?1");
    find.bind(1, std::min(excess, MAX_FORGOTTEN_AT_ONCE));
    if (find.exec() == 0)
        return;
    m_database.exec(
        "UPDATE totals SET forgotten_stored = forgotten_stored + n, forgotten_bytes = forgotten_bytes + b "
        "FROM (SELECT sum(last_sequence) AS n, sum(stored_bytes) AS b FROM module WHERE id IN idle)");
    m_database.exec("DELETE FROM module_release WHERE module IN idle; DELETE FROM module WHERE id IN idle");
    m_keys.clear();
}

void OutboxStore::CountRemoved(const char* counter, const Removed& removed) {
    SQLite::Statement update(m_database, std::string("UPDATE totals SET ") + counter + " = " + counter +
                                             " + ?1, removed_bytes = removed_bytes + ?2");
    update.bind(1, removed.events);
    update.bind(2, removed.bytes);
    update.exec();
}

void OutboxStore::RemoveDelivered(const Batch& batch, std::size_t refused) {
    Guarded("Cannot remove delivered events", [&] {
        WriteTransaction transaction(m_database);
        Removed removed;
        for (const auto& event : batch.events) {
            if (!Delete(event))
                continue;
            ++removed.events;
            removed.bytes += static_cast<std::int64_t>(event.bytes);
        }
        const auto rejected = std::min(static_cast<std::int64_t>(refused), removed.events);
        CountRemoved("refused", {rejected, 0});
        CountRemoved("delivered", {removed.events - rejected, removed.bytes});
        ForgetIdleModules();
        transaction.Commit();
    });
}

void OutboxStore::NoteUploadFailure(const std::string& text, WallTime now) {
    Guarded("Cannot note that the upload fails", [&] {
        WriteTransaction transaction(m_database);
        m_database.exec(UPLOAD_FAILURE);
        SQLite::Statement note(m_database,
                               "INSERT OR REPLACE INTO upload_failure(id, at_ms, text) VALUES(1, ?1, ?2)");
        note.bind(1, static_cast<std::int64_t>(now.time_since_epoch().count()));
        note.bindNoCopy(2, text);
        note.exec();
        transaction.Commit();
    });
}

std::string OutboxStore::MoveToDeadLetters(const StoredEvent& event, const Refusal& refusal, WallTime now) {
    return Guarded("Cannot move an event to the dead letters", [&] {
        WriteTransaction transaction(m_database);
        std::string module;
        SQLite::Statement copy(
            m_database,
            "INSERT INTO dead_letter(uuid, module, release, sequence, event_id, payload, stored_ms, bytes, "
            "refused_ms, status, reason) "
            "SELECT uuid, module, release, sequence, event_id, payload, stored_ms, bytes, ?3, ?4, ?5 "
            "FROM event WHERE id = ?1 AND uuid = ?2");
        copy.bind(1, event.row);
        copy.bindNoCopy(2, event.uuid);
        copy.bind(3, static_cast<std::int64_t>(now.time_since_epoch().count()));
        copy.bind(4, static_cast<std::int64_t>(refusal.status));
        copy.bindNoCopy(5, refusal.reason);
        if (copy.exec() == 1 && Delete(event)) {
            const auto bytes = static_cast<std::int64_t>(event.bytes);
            CountRemoved("dead_lettered", {1, bytes});
            SQLite::Statement held(m_database, "UPDATE totals SET dead_letters = dead_letters + 1, "
                                               "dead_letter_bytes = dead_letter_bytes + ?1");
            held.bind(1, bytes);
            held.exec();
            module = IdentityOf(event.release).id;
            ForgetIdleModules();
        }
        transaction.Commit();
        return module;
    });
}

std::size_t OutboxStore::TrimDeadLetters(std::size_t maxRows, std::size_t maxBytes) {
    return Guarded("Cannot trim the dead letters", [&] {
        std::size_t trimmed = 0;
        SQLite::Statement excess(m_database, "SELECT 1 FROM totals WHERE dead_letters > ?1 OR "
                                             "dead_letter_bytes > ?2");
        excess.bind(1, static_cast<std::int64_t>(maxRows));
        excess.bind(2, static_cast<std::int64_t>(maxBytes));
        while (excess.executeStep()) {
            excess.reset();
            WriteTransaction transaction(m_database);
            const auto oldest =
                m_database.execAndGet("SELECT coalesce(min(id), 0) FROM dead_letter").getInt64();
            SQLite::Statement held(m_database,
                                   "UPDATE totals SET dead_letters = dead_letters - 1, dead_letter_bytes = "
                                   "dead_letter_bytes - b.bytes FROM (SELECT bytes FROM dead_letter WHERE "
                                   "id = ?1) AS b");
            held.bind(1, oldest);
            if (held.exec() == 0) // a person has emptied the table, so the sums are wrong
                m_database.exec("UPDATE totals SET dead_letters = 0, dead_letter_bytes = 0");
            SQLite::Statement remove(m_database, "DELETE FROM dead_letter WHERE id = ?1");
            remove.bind(1, oldest);
            trimmed += remove.exec() == 1 ? 1U : 0U;
            transaction.Commit();
        }
        return trimmed;
    });
}

/// Deletes the oldest events after row `afterRow`: those of `module`, or of all modules when that is 0. Ends
/// at the first event for which `goesOn` returns false.
template <typename GoesOn>
void OutboxStore::DropWhile(std::int64_t afterRow, std::int64_t module, std::size_t maxRows, Removed& removed,
                            Dropped& dropped, GoesOn goesOn) {
    SQLite::Statement candidates(m_database, "SELECT e.id, e.uuid, e.stored_ms, e.bytes, m.module_id "
                                             "FROM event AS e CROSS JOIN module AS m ON m.id = e.module "
                                             "WHERE e.id > ?1 AND (?3 = 0 OR e.module = ?3) "
                                             "ORDER BY e.id LIMIT ?2");
    candidates.bind(1, afterRow);
    candidates.bind(2, static_cast<std::int64_t>(maxRows));
    candidates.bind(3, module);
    std::vector<StoredEvent> doomed;
    while (candidates.executeStep()) {
        StoredEvent event;
        event.storedAt = WallTime(std::chrono::milliseconds(candidates.getColumn(2).getInt64()));
        if (!goesOn(event.storedAt, removed.bytes))
            break;
        event.row = candidates.getColumn(0).getInt64();
        event.uuid = candidates.getColumn(1).getString();
        removed.bytes += candidates.getColumn(3).getInt64();
        ++dropped.modules[candidates.getColumn(4).getString()];
        doomed.push_back(std::move(event));
    }
    candidates.reset();
    for (const auto& event : doomed)
        Delete(event);
    if (module != 0 && !doomed.empty())
        m_lastVictimRow = doomed.back().row;
    dropped.events += doomed.size();
    removed.events += static_cast<std::int64_t>(doomed.size());
}

/// The module with the most waiting bytes, if it has at least `minBytes`; otherwise 0, because no single
/// module fills the outbox.
std::int64_t OutboxStore::LargestModule(std::int64_t minBytes) {
    SQLite::Statement query(m_database, "SELECT coalesce((SELECT id FROM module "
                                        "WHERE stored_bytes - removed_bytes >= ?1 "
                                        "ORDER BY stored_bytes - removed_bytes DESC, id LIMIT 1), 0)");
    query.bind(1, minBytes);
    query.executeStep();
    return query.getColumn(0).getInt64();
}

/// An event in this row can be dropped from now on, so the next search must not begin behind it.
void OutboxStore::ForgetVictimBefore(std::int64_t row) {
    if (row <= m_lastVictimRow)
        m_lastVictim = 0;
}

OutboxStore::Dropped OutboxStore::DropOldest(std::int64_t afterRow, WallTime before, std::int64_t excessBytes,
                                             std::size_t maxRows) {
    return Guarded("Cannot drop old events", [&] {
        WriteTransaction transaction(m_database);
        Dropped dropped;
        Removed removed;
        if (afterRow < std::exchange(m_lastAfterRow, afterRow)) // what was being sent may be dropped now
            ForgetVictimBefore(afterRow + 1);
        DropWhile(afterRow, 0, maxRows, removed, dropped,
                  [&](WallTime storedAt, std::int64_t) { return storedAt < before; });
        const auto tooMuch = [&](WallTime, std::int64_t bytes) { return bytes < excessBytes; };
        if (removed.bytes < excessBytes) {
            const auto victim = LargestModule(excessBytes);
            const bool goesOn = victim != 0 && victim == m_lastVictim;
            const auto from = goesOn ? std::max(afterRow, m_lastVictimRow) : afterRow;
            const auto droppedForAge = dropped.events;
            m_lastVictim = victim;
            DropWhile(from, victim, maxRows - dropped.events, removed, dropped, tooMuch);
            if (dropped.events == droppedForAge) { // all events of this module are being sent
                m_lastVictim = 0;
                DropWhile(afterRow, 0, maxRows - dropped.events, removed, dropped, tooMuch);
            }
        }
        if (removed.events > 0)
            CountRemoved("dropped", removed);
        ForgetIdleModules();
        transaction.Commit();
        return dropped;
    });
}

OutboxStatus OutboxStore::Status() {
    return Guarded("Cannot read the outbox's status", [&] {
        SQLite::Statement query(
            m_database,
            "SELECT outbox_id, stored, delivered, refused, dead_lettered, dropped, waiting, "
            "waiting_bytes, dead_letters, dead_letter_bytes, modules, module_bytes FROM outbox_status");
        query.executeStep();
        const auto number = [&](int column) { return query.getColumn(column).getInt64(); };
        return OutboxStatus{query.getColumn(0).getString(),
                            number(1),
                            number(2),
                            number(3),
                            number(4),
                            number(5),
                            number(6),
                            number(7),
                            number(8),
                            number(9),
                            number(10),
                            number(11)};
    });
}

} // namespace MetrikSdk::outbox
