#pragma once

#include <Poco/Net/DatagramSocket.h>
#include <Poco/Net/SocketAddress.h>

#include "tests/Tools/reportctl/support/ReportctlFixture.h"

/// Listens on the service's port, and runs `reportctl send`.
class SendFixture : public ReportctlFixture {
protected:
    /// Listens in place of the service, and does not interpret what arrives.
    class Listener {
    public:
        Listener() : m_socket(Poco::Net::SocketAddress("127.0.0.1", 9997)) {
            m_socket.setReceiveTimeout(Poco::Timespan(10, 0));
        }

        std::string Receive() {
            std::string text(65'536, '\0');
            text.resize(
                static_cast<std::size_t>(m_socket.receiveBytes(text.data(), static_cast<int>(text.size()))));
            return text;
        }

        /// Whether nothing is left to receive. Over loopback, a datagram has arrived when its send() returns.
        bool IsEmpty() { return !m_socket.poll(Poco::Timespan(0), Poco::Net::Socket::SELECT_READ); }

    private:
        Poco::Net::DatagramSocket m_socket;
    };

    void SetUp() override { std::filesystem::create_directories(Data()); }

    Outcome Send(const std::string& arguments, const std::string& shell = {}) const {
        return Reportctl("send " + arguments, shell);
    }

    /// Makes a file with this content. Returns the argument that names it.
    std::string FileOf(const std::string& content) const {
        const auto path = Data() + "/lines";
        std::ofstream(path, std::ios::binary) << content;
        return "--file '" + path + "' ";
    }

    static constexpr auto NO_LISTENER = "no program listens on 127.0.0.1:9997; is the service running?\n";
};
