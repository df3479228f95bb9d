#pragma once

#include <string>
#include <string_view>
#include <utility>

#include "hublink/report.hpp"

namespace hublink {

/// A message with something that the service forgets when it ends.
///
///     due ──► told ──┬─► due           the service may have lost it
///                    └─► change due    the program has told something new ──► told, or due
///
/// Threads: one at a time.
class Announcement {
public:
    Announcement() = default;

    /// `datagram`: has everything that the service must know. `isWritten`: Sent, or the reason why the
    /// datagram could not be written.
    explicit Announcement(std::string datagram, Result isWritten = Result::Sent) noexcept
        : m_datagram(std::move(datagram)), m_isWritten(isWritten) {}

    /// Replaces what is announced. `change` goes to a service that was told the announcement before.
    void Replace(std::string datagram, std::string change) noexcept {
        m_datagram = std::move(datagram);
        m_change = std::move(change);
        m_due = m_due == Due::Nothing ? Due::Change : Due::Everything;
    }

    Result IsWritten() const { return m_isWritten; }
    bool IsDue() const { return m_due != Due::Nothing && !m_datagram.empty(); }
    std::string_view DueDatagram() const { return m_due == Due::Change ? m_change : m_datagram; }

    void TellAgain() noexcept { m_due = Due::Everything; }
    void IsTold() noexcept { m_due = Due::Nothing; }

private:
    enum class Due { Nothing, Change, Everything };

    std::string m_datagram; ///< Empty when there is nothing to announce.
    std::string m_change;
    Result m_isWritten = Result::Sent;
    Due m_due = Due::Everything;
};

} // namespace hublink
