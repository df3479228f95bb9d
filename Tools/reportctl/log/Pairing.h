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

    /// Whether it holds the most entries that it should hold, or half of them. The limit keeps the memory
    /// small. A refusal that comes more entries later than this does not find its datagram any more.
    bool IsFull() const { return IsOver(MOST_ENTRIES, MOST_BYTES); }
    bool IsHalfFull() const { return IsOver(MOST_ENTRIES / 2, MOST_BYTES / 2); }

    /// How many lines said until now that analytics may have refused events. The service logs the same cause
    /// only once a minute, so later events may have been refused without a line of their own.
    int AnalyticsFailures() const { return m_analyticsFailures; }

private:
    static constexpr std::size_t MOST_ENTRIES = 20'000;
    static constexpr std::size_t MOST_BYTES = std::size_t{16} * 1024 * 1024; ///< of their texts

    bool IsOver(std::size_t entries, std::size_t bytes) const {
        return m_entries.size() > entries || m_bytes > bytes;
    }

    using Fits = std::function<bool(const Entry&)>;

    void AddDatagram(Line line);
    void Add(Entry entry);
    bool Refuse(const Line& line);
    bool RefuseFirst(const Line& line, const std::string& reason, const Fits& fits);
    bool RefuseOnly(const Line& line, const std::string& reason, const Fits& fits);
    bool RefuseUnreadable(const Line& line, const std::string& reason);
    void Mark(std::size_t index, const Line& line, const std::string& reason);

    std::deque<Entry> m_entries;
    std::size_t m_bytes = 0;   ///< of the entries' texts
    std::size_t m_handled = 0; ///< the service has handled so many entries at the front
    std::string m_process;
    int m_analyticsFailures = 0;
};

} // namespace reportctl::log
