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
/// One thread.
class Stream {
public:
    /// How long a datagram waits for its outcome. The service handles a datagram in well under a millisecond,
    /// and the store commits at least ten times a second. A service that is further behind has many datagrams
    /// waiting, and this command does not wait for all of them.
    static constexpr std::chrono::milliseconds PATIENCE{1000};

    Stream(const std::string& directory, const std::vector<std::string>& rotated);

    /// Makes later calls of Read skip the lines before this time.
    void SetSince(terminal::TimePoint since) { m_since = since; }

    /// Reads the log's new lines and looks into the databases. Returns how many entries wait to be taken.
    std::size_t Read();

    /// Calls `visit` with the finished entries in the order of the log, and removes them. An entry is
    /// finished when its outcome is known, or when it has waited for PATIENCE. Stops at the first entry that
    /// still waits.
    void TakeFinished(const std::function<void(Entry&)>& visit);

    bool HasLog() const { return m_follower.HasLiveFile(); }
    std::vector<std::string> TakeComplaints() { return m_outcomes.TakeComplaints(); }

private:
    void ReadLines();
    Backlog CountBacklog();

    Follower m_follower;
    Pairing m_pairing;
    Outcomes m_outcomes;
    terminal::TimePoint m_since = terminal::TimePoint::min();
    bool m_isFirst = true;
};

} // namespace reportctl::log
