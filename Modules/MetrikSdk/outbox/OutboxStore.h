#pragma once

#include <chrono>
#include <cstdint>
#include <map>
#include <memory>
#include <string>

#include <SQLiteCpp/SQLiteCpp.h>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/Sqlite/DatabaseFiles.h"

namespace MetrikSdk::outbox {

/// How many events the outbox has seen.
struct OutboxStatus {
    std::string outboxId;
    std::int64_t stored = 0; ///< The sum of delivered, refused, deadLettered, dropped and waiting.
    std::int64_t delivered = 0;
    std::int64_t refused = 0;      ///< In a request that the collector took, but counted as rejected.
    std::int64_t deadLettered = 0; ///< Refused for good and moved to the dead-letter table.
    std::int64_t dropped = 0;      ///< Dropped to keep within a cap.
    std::int64_t waiting = 0;
    std::int64_t waitingBytes = 0;
    std::int64_t deadLetters = 0; ///< Rows in the dead-letter table now.
    std::int64_t deadLetterBytes = 0;
    std::int64_t modules = 0;     ///< Modules that the file knows.
    std::int64_t moduleBytes = 0; ///< How many bytes these modules take in the file.
};

/// Why a collector did not take an event.
struct Refusal {
    long status = 0;
    std::string reason;
};

/// One open outbox file, and all SQL for it.
///
/// The life of an event:
///
///     stored ──► waiting ──► sent ──┬─► delivered      row deleted
///                  │  ▲             ├─► refused        row deleted: the collector's own count says so
///                  │  └─────────────┤   (no answer: it waits again)
///                  │                └─► dead-lettered  row moved to the dead-letter table
///                  └─► dropped                         row deleted, for a cap
///
/// Only the uploader knows which events are "sent"; that is not stored. When a process dies between sending
/// and deleting, the events are sent again, with the same uuids.
///
/// Durability: after Store returned, the event survives kill -9 of the process. A power cut may lose the
/// events of the last seconds, because the log is synced at checkpoints and not at each commit. It never
/// damages the file.
/// Time: no operation takes longer when more events wait.
/// Threads: one at a time. Several processes may have the same file open. An event is removed by its row and
/// uuid, so no process removes an event that another process has put in the same row.
/// Failure: StoreError.
class OutboxStore {
public:
    /// Opens the file, which must exist. An empty file becomes an outbox.
    ///
    /// `directory`: the descriptor of the directory in which `path` ends, if the caller keeps that directory
    /// open for longer than this object. IsWhole then looks for the side files in this directory, which takes
    /// less time than a look through `path`.
    OutboxStore(const std::string& path, std::chrono::milliseconds lockPatience, int directory = AT_FDCWD);

    /// How long the operations wait for another process's lock.
    void SetLockPatience(std::chrono::milliseconds patience);

    /// Whether a close leaves the write-ahead log as it is. A damaged file is set aside together with its
    /// log.
    void KeepLogOnClose(bool keep);

    /// Whether the files beside the database still have their names. Takes two system calls.
    bool IsWhole() { return m_sideFiles.AreInPlace(); }

    /// Whether the transaction of a failed operation is still open. An event that is stored then would be
    /// rolled back with it.
    bool InTransaction();

    /// Call this when IsWhole returned false, before the store is closed. Returns whether all events are in
    /// the database in spite of that.
    bool Rescue();

    /// Stores the event as the next one of its module. Returns how many bytes it counts, together with the
    /// bytes of a module that is new to the file.
    std::size_t Store(const ModuleIdentity& module, const NewEvent& event);

    /// The oldest events, without those of `without`. Returns at most `maxEvents`, and ends with the event
    /// that reaches `maxBytes`.
    Batch Oldest(std::size_t maxEvents, std::size_t maxBytes, const EventKeys& without = {});

    /// The event, if it still waits.
    Batch One(const EventKey& key);

    /// Deletes those events of `batch` that are still there. `refused` of them count as refused, the others
    /// as delivered.
    void RemoveDelivered(const Batch& batch, std::size_t refused);

    /// Moves the event, if it is still there, to the dead-letter table. Returns the id of its module; empty
    /// when the event is not there.
    std::string MoveToDeadLetters(const StoredEvent& event, const Refusal& refusal, WallTime now);

    /// Keeps the failure, in the place of an earlier one, for a reader of the file.
    void NoteUploadFailure(const std::string& text, WallTime now);

    /// Deletes the oldest dead letters until both limits hold. Returns how many it deleted.
    std::size_t TrimDeadLetters(std::size_t maxRows, std::size_t maxBytes);

    /// What was dropped for a cap.
    struct Dropped {
        std::size_t events = 0;
        std::map<std::string, std::size_t> modules; ///< Events by module id.
    };

    /// Deletes at most `maxRows` events after row `afterRow`. First it deletes those that were stored before
    /// `before`. Then, until `excessBytes` are gone, it deletes the oldest events of the module with the most
    /// waiting bytes. So a module that reports without end loses its own events and not those of others. When
    /// no module has so many bytes, the oldest events of all modules go.
    Dropped DropOldest(std::int64_t afterRow, WallTime before, std::int64_t excessBytes, std::size_t maxRows);

    /// How many modules are remembered although none of their events waits. A suite has some tens of modules,
    /// so their sequence numbers go on.
    static constexpr std::int64_t MAX_IDLE_MODULES = 1000;

    /// Reads the sums. Takes longer with more modules, but not with more events.
    OutboxStatus Status();

private:
    struct ReleaseKeys {
        std::int64_t module = 0;
        std::int64_t release = 0;
        std::size_t newBytes = 0; ///< What the new rows of a module take; 0 when no row was made.
    };
    struct Removed {
        std::int64_t events = 0;
        std::int64_t bytes = 0;
    };

    void Configure();
    bool IsOutbox();
    void CreateOrCheckSchema();
    ReleaseKeys KeysOf(const ModuleIdentity& module);
    ReleaseKeys AddRelease(const ModuleIdentity& module);
    ModuleIdentity IdentityOf(std::int64_t release);
    void ForgetVictimBefore(std::int64_t row);
    void ForgetIdleModules();
    std::int64_t LargestModule(std::int64_t minBytes);
    template <typename GoesOn>
    void DropWhile(std::int64_t afterRow, std::int64_t module, std::size_t maxRows, Removed& removed,
                   Dropped& dropped, GoesOn goesOn);
    std::size_t AddTo(Batch& batch, const SQLite::Statement& row);
    bool Delete(const StoredEvent& event);
    void CountRemoved(const char* counter, const Removed& removed);

    SQLite::Database m_database;
    Sqlite::SideFileWatch m_sideFiles; ///< Made again once the side files are open.
    std::unique_ptr<SQLite::Statement> m_insert;
    std::unique_ptr<SQLite::Statement> m_oldest;
    std::unique_ptr<SQLite::Statement> m_delete;
    /// The module whose events were dropped last for their bytes, and the row of the last of these events.
    /// The next search need not begin at the first row again, as long as no event of the module can be before
    /// that row.
    std::int64_t m_lastVictim = 0;
    std::int64_t m_lastVictimRow = 0;
    std::int64_t m_lastAfterRow = 0;              ///< Of the last call of DropOldest.
    std::map<ModuleIdentity, ReleaseKeys> m_keys; ///< The keys of modules in use, as the file knows them.
};

} // namespace MetrikSdk::outbox
