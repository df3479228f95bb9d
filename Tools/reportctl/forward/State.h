#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include <SQLiteCpp/Database.h>

#include "SystemTool/IO/Descriptor.h"
#include "Tools/reportctl/forward/StoreReader.h"

namespace reportctl::forward {

/// A row that the collector does not take while it takes others. It is tried again.
struct HeldRow {
    Anchor row;
    std::string event;
    int tries = 0; ///< That failed while others were taken.
    std::string reason;
};

/// Rows that will not be sent any more, and why. One, or, where a collector does not say which of a request
/// it rejected, all of the request.
struct RefusedRows {
    std::int64_t first = 0;
    std::int64_t last = 0;
    std::int64_t count = 0; ///< Of those between, the refused ones.
    std::string uid;        ///< Of a single row that could be read.
    std::string event;
    long status = 0; ///< The collector's; 0 when it was not the collector.
    std::string reason;
};

struct Totals {
    std::int64_t forwarded = 0;
    std::int64_t held = 0;
    std::int64_t refused = 0;
};

/// How far the store was sent: a database of our own, in the user's data directory.
///
///     row of the store ──► sent
///                     └──► held ──┬─► sent
///                                 └─► refused: kept by its number, with the reason
///
/// A change is one transaction: after it returns, it survives a kill. A kill before it has rows sent again,
/// under their old uids.
///
/// The installation's identity is that of the outbox for analytics, where there is one: both kinds of records
/// are then known as one installation's, and a lost file of this one changes no row's uid. Else it is made at
/// random.
///
/// Threads: one. One process at a time: the file is locked while this lives. Failure: std::runtime_error for
/// a person when another process has it, or the file is no such database; SQLite::Exception and
/// std::system_error for the rest.
class State {
public:
    /// Makes the file (0600) and its directory (0700) when there is none. `outbox` is the path of the outbox.
    State(const std::string& path, const std::string& outbox);

    /// What is there, without making or locking anything: for a dry run. Nothing is known without a file.
    static Place LookAt(const std::string& path);

    const Place& Where() const { return m_place; }

    /// The oldest first.
    std::vector<HeldRow> Held(std::size_t max = 1000);
    Totals Sums();

    /// What changes at once.
    struct Change {
        std::int64_t from =
            Place::BEGINNING; ///< Of the page. Before the known position: the store is another one.
        std::int64_t position = Place::BEGINNING; ///< From now on.
        std::int64_t forwarded = 0;               ///< Rows that the collector took.
        std::vector<Anchor>
            sent; ///< Of the request. Held ones are held no more, and the last one is an anchor.
        std::vector<HeldRow> held;
        std::vector<RefusedRows> refused;
    };
    void Commit(const Change& change);

private:
    void Lock(const std::string& path);
    void Open(const std::string& path, const std::string& outbox);
    void MakeTables(const std::string& outbox);
    void ReadPlace();
    void Write(const Change& change);
    void MoveTo(const Change& change);
    void Hold(const HeldRow& held);
    void Release(const Anchor& row);
    void Refuse(const RefusedRows& refused);
    void Run(const char* sql, std::int64_t number);

    SystemTool::IO::Descriptor m_lock; ///< Closed after the database: closing it drops SQLite's locks, too.
    std::unique_ptr<SQLite::Database> m_database;
    Place m_place;
};

} // namespace reportctl::forward
