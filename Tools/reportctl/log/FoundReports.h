#pragma once

#include <cstddef>
#include <unordered_set>

#include "Tools/reportctl/log/Entry.h"
#include "Tools/reportctl/outbox/Events.h"
#include "Tools/reportctl/store/RecentRows.h"

namespace reportctl::log {

/// Datagrams that a search has found, and the rows and events that the service made of them. A row or an
/// event is recognised by its content. So it does not matter how the sender wrote the JSON: with spaces, with
/// escapes, or with quotes written twice.
///
/// Memory: about 40 bytes for each datagram, because only a hash of 64 bits is kept.
class FoundReports {
public:
    /// Adds a datagram. One that the service refused is left out, because it has no row and no event.
    void Add(const Entry& datagram);

    bool HaveRows() const { return !m_rows.empty(); }

    /// Whether the row has the content of one of the datagrams.
    bool HaveRow(const store::RowContent& row) const;

    /// Whether the event has the content of one of the datagrams.
    bool HaveEvent(const outbox::Event& event) const;

private:
    std::unordered_set<std::size_t> m_rows;
    std::unordered_set<std::size_t> m_events;
};

} // namespace reportctl::log
