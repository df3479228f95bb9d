#pragma once

#include <string>

#include <Poco/Net/DatagramSocket.h>
#include <Poco/Timespan.h>

namespace reportctl::send {

/// Sends texts to the service, each as one datagram.
///
/// The service does not answer, so this class knows only whether a program listens on the port. The socket is
/// connected, and for a connected socket the system reports a datagram to a port that no program has bound.
///
/// One thread. Failure: throws Poco::Exception when the system refuses to send.
class Sender {
public:
    Sender();

    /// Sends one datagram. Returns false when the system has reported that no program listens. The system may
    /// report this later; then the next call returns false.
    bool Send(const std::string& text);

    /// Waits a moment for such a late report. Returns false when no program listens.
    bool IsHeard();

    /// The service's address, for people.
    static std::string Address();

private:
    bool IsRefused() const;

    Poco::Net::DatagramSocket m_socket;
};

} // namespace reportctl::send
