#pragma once

#include <cstdint>
#include <set>
#include <string>
#include <vector>

#include "Tools/reportctl/log/Pairing.h"
#include "Tools/reportctl/outbox/RecentEvents.h"
#include "Tools/reportctl/store/RecentRows.h"

namespace reportctl::log {

/// How many datagrams a command is about at its start, at the most: so many rows and events are read.
struct Backlog {
    std::int64_t reports = 0;
    std::int64_t events = 0;
};

/// Tells of datagrams whether the store or the outbox has them.
///
/// An event that was delivered has left the outbox. It counts as toAnalytics when its module has stored as
/// many events as the log has datagrams of the module, so that none can be missing; otherwise it stays
/// unknown.
///
/// Call Read, then read the log, then Resolve: an event that was read and has no line yet would be counted
/// for another.
///
/// One thread. Failure: nothing throws for a database that is missing or cannot be read; Complaints tells it.
class Outcomes {
public:
    Outcomes(const std::string& storePath, const std::string& outboxPath)
        : m_storePath(storePath), m_outboxPath(outboxPath), m_rows(storePath), m_events(outboxPath) {}

    /// Reads what came since; the first time, what the backlog needs.
    void Read(const Backlog& backlog);

    /// Gives every open entry its outcome that can have one now.
    void Resolve(Pairing& pairing);

    /// Why something cannot be told, each reason once.
    std::vector<std::string> TakeComplaints();

private:
    void Complain(const std::string& reason);
    void Find(Entry& entry);
    void CountBefore(Pairing& pairing);
    void CountSince(Pairing& pairing);

    std::string m_storePath;
    std::string m_outboxPath;
    store::RecentRows m_rows;
    outbox::RecentEvents m_events;
    bool m_isFirst = true;
    std::vector<std::string> m_complaints;
    std::set<std::string> m_told;
};

} // namespace reportctl::log
