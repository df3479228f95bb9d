#include "Tools/reportctl/log/FoundReports.h"

#include "Tools/reportctl/outbox/RecentEvents.h"

namespace reportctl::log {

void FoundReports::Add(const Entry& datagram) {
    const auto& message = datagram.message;
    if (!datagram.isReadable || !message.fault.empty() || datagram.outcome == Outcome::Refused)
        return;
    if (message.kind == message::Kind::Report)
        m_rows.insert(store::HashOf(store::AsStored({message.eventID, message.value, message.createTime})));
    if (message.kind == message::Kind::Event)
        if (const auto event = outbox::HashOf({message.eventID, message.value, message.createTime}))
            m_events.insert(*event);
}

bool FoundReports::HaveRow(const store::RowContent& row) const {
    return m_rows.contains(store::HashOf(row));
}

bool FoundReports::HaveEvent(const outbox::Event& event) const {
    return !m_events.empty() && m_events.contains(outbox::HashOf(event));
}

} // namespace reportctl::log
