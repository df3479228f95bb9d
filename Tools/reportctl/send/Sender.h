#pragma once

#include <string>

#include <Poco/Net/DatagramSocket.h>
#include <Poco/Timespan.h>

namespace reportctl::send {

/// Sends texts to the service, a datagram each.
///
/// A datagram gets no answer, so this can tell only whether a program listens on the port: the socket is
/// connected, and the system then reports a datagram for a port that no program has bound.
///
/// One thread. Failure: what the system refuses to send throws Poco::Exception.
class Sender {
public:
    Sender();

    /// Sends one datagram. False when no program listens, as far as is known by then: the report about this
    /// datagram may come later, and is then the answer to the next call.
    bool Send(const std::string& text);

    /// Waits a moment for a report that comes late. False when no program listens.
    bool IsHeard();

    /// The address that is sent to, for people.
    static std::string Address();

private:
    bool IsRefused() const;

    Poco::Net::DatagramSocket m_socket;
};

} // namespace reportctl::send
