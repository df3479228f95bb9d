#pragma once

#include <cstdint>
#include <set>
#include <string>
#include <vector>

#include "Tools/reportctl/log/Pairing.h"
#include "Tools/reportctl/outbox/RecentEvents.h"
#include "Tools/reportctl/store/RecentRows.h"

namespace reportctl::log {

/// How many reports and events the log has at the command's start. So many rows and events of the databases
/// are read.
struct Backlog {
    std::int64_t reports = 0;
    std::int64_t events = 0;
};

/// Finds out which datagrams the store or the outbox has.
///
/// An event that was delivered has left the outbox. It counts as toAnalytics when its module has stored as
/// many events as the log has datagrams of the module, so that none can be missing. Otherwise its outcome
/// stays unknown.
///
/// Call Read, then read the log, then call Resolve. In another order, an event could be read that has no line
/// yet, and it would be counted for another datagram. Only the first time, the log is read before Read, which
/// needs to know the backlog.
///
/// One thread. Failure: nothing throws when a database is missing or cannot be read; TakeComplaints returns
/// the reason.
class Outcomes {
public:
    Outcomes(const std::string& storePath, const std::string& outboxPath)
        : m_storePath(storePath), m_outboxPath(outboxPath), m_rows(storePath), m_events(outboxPath) {}

    /// Reads the rows and events that were added since the last call. The first call reads as many as
    /// `backlog` needs.
    void Read(const Backlog& backlog);

    /// Gives an outcome to every open entry whose outcome is known now.
    void Resolve(Pairing& pairing);

    /// The reasons why some outcomes cannot be known. Each reason is returned once.
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
