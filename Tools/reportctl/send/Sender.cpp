#include "Tools/reportctl/send/Sender.h"

#include <cerrno>

#include <Poco/Net/NetException.h>
#include <Poco/Net/SocketAddress.h>
#include <Poco/Net/SocketImpl.h>

#include "Common/ServiceConstants.h"
#include "Common/Wire.h"

namespace reportctl::send {
namespace {

/// How long the system may take to report that no program listens. Over loopback, Linux reports it before the
/// send returns, but no system promises that. A person does not notice this wait at the end of a command.
constexpr long REFUSAL_WAIT_MS = 20;

} // namespace

Sender::Sender() {
    m_socket.connect(Poco::Net::SocketAddress(SyncServiceReport::UDP_SERVER_IP, Wire::PORT));
}

bool Sender::Send(const std::string& text) {
    try {
        m_socket.sendBytes(text.data(), static_cast<int>(text.size()));
    } catch (const Poco::Net::ConnectionRefusedException&) { // the datagram before was refused
        return false;
    }
    return !IsRefused();
}

bool Sender::IsHeard() {
    const Poco::Timespan wait(REFUSAL_WAIT_MS * Poco::Timespan::MILLISECONDS);
    m_socket.poll(wait, Poco::Net::Socket::SELECT_READ | Poco::Net::Socket::SELECT_ERROR);
    return !IsRefused();
}

/// Whether the socket has the error of a refusal. Reading the error also clears it.
bool Sender::IsRefused() const {
    return m_socket.impl()->socketError() == ECONNREFUSED;
}

std::string Sender::Address() {
    return Poco::Net::SocketAddress(SyncServiceReport::UDP_SERVER_IP, Wire::PORT).toString();
}

} // namespace reportctl::send
