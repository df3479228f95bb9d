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

/// How many events the outbox has seen, each in exactly one of the places below.
struct OutboxStatus {
    std::string outboxId;
    std::int64_t stored = 0; ///< The sum of all that follow.
    std::int64_t delivered = 0;
    std::int64_t refused = 0;      ///< Taken in a partial success that counted them as rejected.
    std::int64_t deadLettered = 0; ///< Refused for good and moved to the dead-letter table.
    std::int64_t dropped = 0;      ///< Given up for a cap.
    std::int64_t waiting = 0;
    std::int64_t waitingBytes = 0;
    std::int64_t deadLetters = 0; ///< Rows that the dead-letter table holds now.
    std::int64_t deadLetterBytes = 0;
    std::int64_t modules = 0;     ///< Known to the file.
    std::int64_t moduleBytes = 0; ///< What they take there.
};

/// Why a collector did not take an event.
struct Refusal {
    long status = 0;
    std::string reason;
};

/// One open outbox file, and all SQL of it.
///
/// The life of an event:
///
///     stored ──► waiting ──► sent ──┬─► delivered      row deleted
///                  │  ▲             ├─► refused        row deleted: the collector's own count says so
///                  │  └─────────────┤   (no answer: it waits again)
///                  │                └─► dead-lettered  row moved to the dead-letter table
///                  └─► dropped                         row deleted, for a cap
///
/// "Sent" is known to the uploader alone and is not stored: a process that dies between sending and deleting
/// sends again, with the same uuid.
///
/// Durability: after Store returns, the event survives kill -9 of the process. A power cut may cost the last
/// seconds (the log is synced at checkpoints, not at each commit) and never damages the file.
/// Cost: no operation depends on how many events wait.
/// Threads: one at a time. Several processes may have the same file open; removal is by row and uuid, so that
/// no process removes what another has put in the same place.
/// Failure: StoreError.
class OutboxStore {
public:
    /// Opens the existing file, an empty one included, which becomes an outbox.
    OutboxStore(const std::string& path, std::chrono::milliseconds lockPatience);

    /// How long the operations wait for another process that holds the lock.
    void SetLockPatience(std::chrono::milliseconds patience);

    /// Whether closing leaves the write-ahead log as it is: a damaged file is set aside together with it.
    void KeepLogOnClose(bool keep);

    /// Whether the files beside the database still have their names. Two system calls.
    bool IsWhole() { return m_sideFiles.AreInPlace(); }

    /// Whether a transaction of an operation that failed is still open. What is stored then, would be undone
    /// with it.
    bool InTransaction();

    /// When it is not whole, before it is closed: whether all events are in the file all the same.
    bool Rescue();

    /// Stores the event as its module's next one. Returns the bytes that it counts for, with those of a
    /// module that the file did not know.
    std::size_t Store(const ModuleIdentity& module, const NewEvent& event);

    /// The oldest events but those of `without`, at most `maxEvents`, ending with the one that reaches
    /// `maxBytes`.
    Batch Oldest(std::size_t maxEvents, std::size_t maxBytes, const EventKeys& without = {});

    /// The event, if it still waits.
    Batch One(const EventKey& key);

    /// Deletes what is still there of `batch`. `refused` of them count as refused, the others as delivered.
    void RemoveDelivered(const Batch& batch, std::size_t refused);

    /// Moves the event, if it is still there, to the dead-letter table. Returns its module's id; empty if it
    /// is not there.
    std::string MoveToDeadLetters(const StoredEvent& event, const Refusal& refusal, WallTime now);

    /// Deletes the oldest dead letters until both bounds hold. Returns how many.
    std::size_t TrimDeadLetters(std::size_t maxRows, std::size_t maxBytes);

    /// What a cap cost, by module.
    struct Dropped {
        std::size_t events = 0;
        std::map<std::string, std::size_t> modules; ///< By id.
    };

    /// Deletes events behind row `afterRow`, at most `maxRows`: those that were stored before `before`, and
    /// then, until `excessBytes` are gone, the oldest ones of the module with the most waiting bytes. So a
    /// module that reports without end loses its own events and not the others'. When no module has so many,
    /// the oldest of all go.
    Dropped DropOldest(std::int64_t afterRow, WallTime before, std::int64_t excessBytes, std::size_t maxRows);

    /// So many modules are remembered when nothing of theirs waits. A suite has some tens, whose numbers so
    /// go on.
    static constexpr std::int64_t MAX_IDLE_MODULES = 1000;

    /// Reads the sums; grows with the number of modules, not of events.
    OutboxStatus Status();

private:
    struct ReleaseKeys {
        std::int64_t module = 0;
        std::int64_t release = 0;
        std::size_t newBytes = 0; ///< What its rows take, when they were just made.
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
    void ForgetIdleModules();
    std::int64_t LargestModule(std::int64_t minBytes);
    template <typename GoesOn>
    void DropWhile(std::int64_t afterRow, std::int64_t module, std::size_t maxRows, Removed& removed,
                   Dropped& dropped, GoesOn goesOn);
    std::size_t AddTo(Batch& batch, const SQLite::Statement& row);
    bool Delete(const StoredEvent& event);
    void CountRemoved(const char* counter, const Removed& removed);

    SQLite::Database m_database;
    Sqlite::SideFileWatch m_sideFiles; ///< Made anew once they are open.
    std::unique_ptr<SQLite::Statement> m_insert;
    std::unique_ptr<SQLite::Statement> m_oldest;
    std::unique_ptr<SQLite::Statement> m_delete;
    std::int64_t m_lastVictim = 0; ///< The module whose events were dropped last for the bytes,
    std::int64_t m_lastVictimRow =
        0; ///< up to this one: the next look need not begin at the first row again.
    std::map<ModuleIdentity, ReleaseKeys> m_keys; ///< What the file already knows of the modules in use.
};

} // namespace MetrikSdk::outbox
