#pragma once

#include <string>
#include <vector>

#include <Poco/Net/DatagramSocket.h>
#include <Poco/Net/SocketAddress.h>

/// Listens on the service's port and does not interpret what arrives. Only in the sandbox, where no other
/// program has the port.
class ServicePort {
public:
    ServicePort() : m_socket(Poco::Net::SocketAddress("127.0.0.1", 9997)) {
        m_socket.setReceiveBufferSize(8 * 1024 * 1024);
    }

    /// The datagrams that have arrived since the last call. Over loopback, a datagram has arrived when its
    /// send() returns.
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

    /// Fills the socket's buffer. The system then drops all datagrams until the next Take.
    void Fill() {
        for (const int bytes :
             {60'000, 1}) { // the small ones take the room that is too small for a large one
            const std::string text(static_cast<std::size_t>(bytes), 'x');
            for (int i = 0; i < 500; ++i) // the system makes the buffer at most 16 MiB
                m_sender.sendTo(text.data(), bytes, m_socket.address());
        }
    }

    /// The one datagram that has arrived. When there is none or more than one, a text that no datagram has.
    std::string TakeOne() {
        const auto texts = Take();
        return texts.size() == 1 ? texts.front() : std::to_string(texts.size()) + " datagrams";
    }

private:
    Poco::Net::DatagramSocket m_socket;
    Poco::Net::DatagramSocket m_sender{Poco::Net::SocketAddress::IPv4};
};
