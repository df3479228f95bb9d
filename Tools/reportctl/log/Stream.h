#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

#include "Tools/reportctl/log/Follower.h"
#include "Tools/reportctl/log/Outcomes.h"
#include "Tools/reportctl/log/Pairing.h"

namespace reportctl::log {

/// The log as a stream of entries with their outcomes. It reads the lines, pairs refusals with datagrams, and
/// looks into the databases.
///
/// Memory: it holds a part of the log at a time (see Pairing), and what Outcomes needs.
///
/// One thread.
class Stream {
public:
    /// How long a datagram waits for its outcome. The service handles a datagram in well under a millisecond,
    /// and the store commits at least ten times a second. A service that is further behind has many datagrams
    /// waiting, and this command does not wait for all of them.
    static constexpr std::chrono::milliseconds PATIENCE{1000};

    Stream(std::string directory, std::vector<std::string> rotated);

    /// Makes later calls of Read skip the lines before this time.
    void SetSince(terminal::TimePoint since) { m_since = since; }

    /// Counts the entries that the log has now, and reads what the databases have of them. Returns the count.
    /// Call it once, before Read.
    std::size_t Begin();

    /// Reads the log's next lines and looks into the databases.
    void Read();

    /// Whether the log has more lines than Read could take. Take entries, then call Read again.
    bool HasMore() const { return m_hasMore; }

    /// Whether all entries of the log were taken.
    bool IsAtEnd() { return !m_hasMore && m_pairing.Entries().empty(); }

    /// Calls `visit` with the finished entries in the order of the log, and removes them. An entry is
    /// finished when its outcome is known, or when it has waited for PATIENCE. Stops at the first entry that
    /// still waits.
    void TakeFinished(const std::function<void(Entry&)>& visit);

    std::vector<std::string> TakeComplaints() { return m_outcomes.TakeComplaints(); }

    /// The paths of the outboxes that exist; see Outcomes.
    std::vector<std::string> OutboxFiles() const { return m_outcomes.OutboxFiles(); }

private:
    bool ReadLines(Follower& follower, Pairing& pairing) const;
    Survey TakeSurvey() const;

    std::string m_directory;
    std::vector<std::string> m_rotated;
    Follower m_follower;
    Pairing m_pairing;
    Outcomes m_outcomes;
    terminal::TimePoint m_since = terminal::TimePoint::min();
    std::size_t m_before = 0; ///< entries that Begin counted and that were not taken yet
    bool m_hasMore = true;
};

} // namespace reportctl::log
