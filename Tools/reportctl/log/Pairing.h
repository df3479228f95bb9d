#pragma once

#include <deque>
#include <functional>
#include <string>

#include "Tools/reportctl/log/Entry.h"

namespace reportctl::log {

/// Makes entries of the log's lines, and finds the datagram that a refusal is about.
///
/// The service handles datagrams in the order in which it logs their arrival. It logs a refusal when it
/// handles the datagram, which may be long after the arrival. Most refusals name what they refuse: they are
/// about the first such datagram that is still open. A refusal that names nothing is paired with a datagram
/// only when no other datagram can be meant. Otherwise the refusal stays an entry of its own, and the
/// datagram stays "unknown".
///
/// One thread.
class Pairing {
public:
    /// Takes the next line of the log. A reference to an entry stays valid until DropFront removes the entry.
    void Take(Line line);

    /// The entries, oldest first. The caller removes an entry with DropFront when it has shown it.
    std::deque<Entry>& Entries() { return m_entries; }
    void DropFront();

    /// How many lines said until now that analytics may have refused events. The service logs the same cause
    /// only once a minute, so later events may have been refused without a line of their own.
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
    std::size_t m_handled = 0; ///< the service has handled so many entries at the front
    std::string m_process;
    int m_analyticsFailures = 0;
};

} // namespace reportctl::log
