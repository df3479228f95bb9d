#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "Tools/reportctl/log/Pairing.h"
#include "Tools/reportctl/outbox/RecentEvents.h"
#include "Tools/reportctl/store/RecentRows.h"

namespace reportctl::log {

/// Counts of what the log has at the command's start.
struct Survey {
    std::size_t entries = 0;
    std::int64_t reports = 0;
    std::map<std::string, std::int64_t> events; ///< by module; refused ones are not counted
    int analyticsFailures = 0;                  ///< see Pairing::AnalyticsFailures
    std::set<std::string> directories;          ///< the database directories that modules announced

    void Add(const Entry& entry);
};

/// Finds out which datagrams the store or an outbox has. It reads the outbox in the service's own directory,
/// and the outboxes in directories that modules announced in the log. It does not read an outbox in a
/// directory that other users may write to.
///
/// An event that was delivered has left the outbox. It counts as toAnalytics when its module has stored as
/// many events as the log has datagrams of the module, so that none can be missing. Otherwise its outcome
/// stays unknown.
///
/// Call ReadNew, then read the log, then call Resolve. In another order, an event could be read that has no
/// line yet, and it would be counted for another datagram.
///
/// Memory: about 50 bytes for each report and 150 bytes for each event of the survey.
///
/// One thread. Failure: nothing throws when a database is missing or cannot be read; TakeComplaints returns
/// the reason.
class Outcomes {
public:
    Outcomes(std::string storePath, const std::string& outboxPath);

    /// Reads as many rows and events as the survey needs. Call it once, before all else.
    void Begin(const Survey& survey);

    /// Reads the rows and events that were added since the last call.
    void ReadNew();

    /// Gives an outcome to every open entry whose outcome is known now. The first `before` entries are those
    /// that the survey counted.
    void Resolve(Pairing& pairing, std::size_t before);

    /// The reasons why some outcomes cannot be known. Each reason is returned once.
    std::vector<std::string> TakeComplaints();

    /// The paths of the outboxes that exist.
    std::vector<std::string> OutboxFiles() const;

private:
    struct Outbox {
        std::string path;
        outbox::RecentEvents events;
    };

    void Complain(const std::string& reason);
    void Know(const std::string& directory);
    void ReadRows(std::int64_t before);
    void ReadEvents(std::int64_t before);
    void Find(Entry& entry);
    bool TakeEvent(const message::Message& report);
    void CountSince(Pairing& pairing, std::size_t before);

    std::string m_storePath;
    store::RecentRows m_rows;
    std::deque<Outbox> m_outboxes;     ///< the first one is in the service's own directory
    std::set<std::string> m_known;     ///< announced directories whose outbox was found
    std::set<std::string> m_allStored; ///< modules that stored all events that the survey counted
    std::vector<std::string> m_complaints;
    std::set<std::string> m_told;
};

} // namespace reportctl::log
