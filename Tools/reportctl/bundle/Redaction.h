#pragma once

#include <string>
#include <string_view>

namespace reportctl::bundle {

/// Takes out of texts what tells of a person: values of reports, open ids, the home directory's path.
class Redaction {
public:
    /// `withValues`: nothing is taken out. `home`: the home directory; empty when there is none.
    Redaction(bool withValues, std::string home) : m_withValues(withValues), m_home(std::move(home)) {}

    /// A line of the service's log. Of a datagram, the members that the service reads are left, without the
    /// value and the open id; a datagram that is no JSON is left out, and so is the statement of a report
    /// that the store refused.
    std::string OfLogLine(const std::string& text) const;

    /// Any other text: paths below the home directory begin with "~".
    std::string OfText(std::string text) const;

private:
    bool m_withValues;
    std::string m_home;
};

/// A datagram without what tells of a person.
std::string RedactedDatagram(const std::string& text);

} // namespace reportctl::bundle
