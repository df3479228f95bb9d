#pragma once

#include <deque>
#include <functional>
#include <string>

#include "Tools/reportctl/log/Entry.h"

namespace reportctl::log {

/// Makes entries of the log's lines, and finds the datagram that a refusal is about.
///
/// The service handles datagrams in the order in which it logs their arrival, and logs a refusal when it
/// comes to it, which may be long after. Most refusals name what they refuse: then it is the first such
/// datagram that is still open. One that names nothing is told of a datagram only when no other one can be
/// meant; else it stays a line of its own, and the datagram "unknown".
///
/// One thread.
class Pairing {
public:
    /// What to do with a line. The reference to an entry holds until it is taken away from the front.
    void Take(Line line);

    /// Oldest first. The caller takes away what it has shown.
    std::deque<Entry>& Entries() { return m_entries; }
    void DropFront();

    /// How many lines said, so far, that an event could not be kept for analytics. They are told once a
    /// minute for the same cause, so events without a line of their own may have been refused after one.
    int AnalyticsFailures() const { return m_analyticsFailures; }

private:
    using Fits = std::function<bool(const Entry&)>;

    void AddDatagram(Line line);
    bool Refuse(const Line& line);
    bool RefuseFirst(const Line& line, const std::string& reason, const Fits& fits);
    bool RefuseOnly(const Line& line, const std::string& reason, const Fits& fits);
    bool RefuseUnreadable(const Line& line, const std::string& reason);
    void Mark(std::size_t index, const Line& line, const std::string& reason);

    std::deque<Entry> m_entries;
    std::size_t m_handled = 0; ///< the service is through with so many of them
    std::string m_process;
    int m_analyticsFailures = 0;
};

} // namespace reportctl::log
