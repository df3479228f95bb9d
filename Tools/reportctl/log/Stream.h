#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

#include "Tools/reportctl/log/Follower.h"
#include "Tools/reportctl/log/Outcomes.h"
#include "Tools/reportctl/log/Pairing.h"

namespace reportctl::log {

/// The log as a stream of entries, each with its outcome: reads the lines, pairs the refusals, asks the
/// databases.
///
/// One thread.
class Stream {
public:
    /// So long a datagram waits for its outcome. Handling one takes well under a millisecond, and the store
    /// commits at least ten times a second; a service that is further behind has many waiting, and no one
    /// wants to wait for them all.
    static constexpr std::chrono::milliseconds PATIENCE{1000};

    Stream(const std::string& directory, const std::vector<std::string>& rotated);

    /// Leaves out the lines before this time.
    void SetSince(terminal::TimePoint since) { m_since = since; }

    /// Reads what the log has now, and asks the databases. Returns how many entries there are in all.
    std::size_t Read();

    /// Hands over the entries whose outcome is known, or will not be, in the order of the log; the first that
    /// waits stops it.
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
