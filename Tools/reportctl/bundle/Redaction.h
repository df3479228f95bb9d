#pragma once

#include <string>
#include <string_view>

namespace reportctl::bundle {

/// Takes personal data out of texts: the values of reports, open ids and the home directory's path.
class Redaction {
public:
    /// `withValues`: take nothing out. `home`: the home directory; empty when there is none.
    Redaction(bool withValues, std::string home) : m_withValues(withValues), m_home(std::move(home)) {}

    /// A line of the service's log. Of a report, the event id and the time remain; of a control message, the
    /// module, its paths and the versions remain. A value and an open id are replaced by their sizes, and so
    /// is a datagram that is not JSON. The statement of a report that the store refused is left out.
    std::string OfLogLine(const std::string& text) const;

    /// Any other text, without the statements of reports. Paths below the home directory begin with "~".
    std::string OfText(std::string text) const;

private:
    bool m_withValues;
    std::string m_home;
};

/// A datagram without personal data.
std::string RedactedDatagram(const std::string& text);

} // namespace reportctl::bundle
