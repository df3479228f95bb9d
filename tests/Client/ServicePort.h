#pragma once

#include <string>
#include <vector>

#include <Poco/Net/DatagramSocket.h>
#include <Poco/Net/SocketAddress.h>

/// Listens where the service would, and reads nothing into what arrives. In the sandbox only, which has the
/// port to itself.
class ServicePort {
public:
    ServicePort() : m_socket(Poco::Net::SocketAddress("127.0.0.1", 9997)) {
        m_socket.setReceiveBufferSize(8 * 1024 * 1024);
    }

    /// What has arrived since the last call. A datagram over loopback has arrived when its sender goes on.
    std::vector<std::string> Take() {
        std::vector<std::string> texts;
        while (m_socket.poll(Poco::Timespan(0), Poco::Net::Socket::SELECT_READ)) {
            std::string text(65'536, '\0');
            text.resize(
                static_cast<std::size_t>(m_socket.receiveBytes(text.data(), static_cast<int>(text.size()))));
            texts.push_back(text);
        }
        return texts;
    }

    /// The one datagram that has arrived; a text that no datagram has when there is none, or more.
    std::string TakeOne() {
        const auto texts = Take();
        return texts.size() == 1 ? texts.front() : std::to_string(texts.size()) + " datagrams";
    }

private:
    Poco::Net::DatagramSocket m_socket;
};
