#include "App/UDPServer.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <exception>
#include <iostream>

#include <sys/socket.h>

#include <Poco/Error.h>
#include <Poco/Exception.h>
#include <Poco/Net/SocketAddress.h>
#include <Poco/Timespan.h>

#include "Common/Constants.h" // nothing else of Common, because the other headers bring the logger

namespace {

// How long Stop may wait for the loop. Because the poll ends this soon, the loop needs no second socket that
// wakes it.
constexpr long POLL_TIMEOUT_MS = 250;

/// The receive buffer that we ask the kernel for. The kernel's default buffer holds some hundred datagrams: a
/// burst fills it while this thread waits for a processor.
constexpr int SOCKET_BUFFER_BYTES = 8 * 1024 * 1024;

/// Prints the current exception. Throws when there is no memory for its text, so that a line is printed whole
/// or not at all.
void PrintExceptionUnderWay() {
    try {
        throw;
    } catch (const Poco::Exception& error) {
        const std::string text = error.displayText();
        std::cout << "Poco exception: " << text << std::endl;
    } catch (const std::exception& error) {
        std::cout << "Std exception: " << error.what() << std::endl;
    } catch (...) {
        const int code = Poco::Error::last();
        const std::string text = Poco::Error::getMessage(code);
        std::cout << "Unknown exception,eCode:" << code << ",desc:" << text << std::endl;
    }
}

/// For `catch (...)`: prints the current exception. When there is no memory for its text, prints that second
/// exception instead.
void PrintCaughtException() noexcept {
    try {
        PrintExceptionUnderWay();
    } catch (...) {
        try {
            PrintExceptionUnderWay();
        } catch (...) { // no memory is left for any line
        }
    }
}

} // namespace

/// The buffer for one datagram. The byte after the room for the largest datagram is always zero, so that the
/// text ends there also when a datagram fills the buffer.
class UDPServer::Buffer {
public:
    /// Makes all bytes zero. It writes only to those bytes that the last datagram filled; the others are zero
    /// already. A usual report fills a fiftieth of the buffer. To zero the whole buffer took a tenth of the
    /// program's own time for a datagram.
    void Clear() {
        std::fill_n(m_bytes.begin(), m_used, '\0');
        m_used = 0;
    }

    /// Receives a datagram into the buffer, which must be clear. Result and failure are those of the socket's
    /// receiveFrom.
    int Receive(Poco::Net::DatagramSocket& socket) {
        // The call may fail or throw after bytes were written: the system copies a datagram with a wrong
        // checksum here, too, before it drops it.
        m_used = Wire::MAX_BYTES;
        sockaddr* sender = reinterpret_cast<sockaddr*>(&m_sender);
        poco_socklen_t senderBytes = sizeof m_sender;
        poco_socklen_t* senderLength = &senderBytes;
        const int bytes = socket.receiveFrom(m_bytes.data(), Wire::MAX_BYTES, &sender, &senderLength);
        if (bytes >= 0)
            m_used = static_cast<std::size_t>(bytes);
        return bytes;
    }

    /// The bytes up to the first zero byte. The reference is valid until the next call.
    const std::string& Text() { return m_text.assign(m_bytes.data()); }

private:
    std::array<char, Wire::MAX_BYTES + 1> m_bytes{};
    std::size_t m_used = 0; ///< How many of the first bytes may be other than zero.
    std::string m_text;     ///< A member, so that its memory is allocated once and not for each datagram.

    /// The sender is not checked: every program on this machine may send. This is the system's type, because
    /// Poco::Net::SocketAddress allocates memory for each datagram.
    sockaddr_storage m_sender{};
};

UDPServer::~UDPServer() {
    Stop();
}

bool UDPServer::Start(const std::string& ip, int port) {
    try {
        const Poco::Net::SocketAddress address(ip, static_cast<std::uint16_t>(port));
        // Address reuse and port reuse, so that a service that was just restarted can bind at once.
        m_socket.bind(address, true, true);
        // Address reuse is switched off again once the port is bound. Otherwise a later socket of any user
        // could bind the same address, and the kernel would deliver the datagrams to that socket. Port reuse
        // stays on: only sockets of this user can use it, so the next service still binds at once.
        m_socket.setReuseAddress(false);
        try {
            m_socket.setReceiveBufferSize(SOCKET_BUFFER_BYTES);
        } catch (const Poco::Exception&) { // the service works with the smaller buffer, too
        }
        m_socket.setBlocking(false);
        m_thread.start(*this);
        return true;
    } catch (...) {
        PrintCaughtException();
        return false;
    }
}

void UDPServer::run() {
    Buffer buffer;
    if (m_bStop)
        return;
    bool more = false;
    do {
        more = (more || WaitForDatagram()) && ReceiveOne(buffer);
    } while (!m_bStop);
}

/// Waits until a datagram is there or the poll timeout is over; true when there is a datagram. We keep one
/// poll set: Poco's own poll of a socket makes, fills, waits for and closes a set in each call, which is four
/// system calls instead of one.
///
/// A poll that fails (on a closed socket) would fail again at once, for ever. So only the first failure is
/// printed, and after each failure the thread sleeps for the poll timeout.
bool UDPServer::WaitForDatagram() {
    const Poco::Timespan timeout(POLL_TIMEOUT_MS * Poco::Timespan::MILLISECONDS);
    try {
        if (!m_poll)
            m_poll.emplace().add(m_socket, Poco::Net::PollSet::POLL_READ);
        const bool readable = !m_poll->poll(timeout).empty();
        if (!readable)
            m_poll->add(m_socket, Poco::Net::PollSet::POLL_READ); // throws when the socket was closed
        m_pollFailed = false;
        if (!readable && m_watch != nullptr)
            m_watch->Idle();
        return readable;
    } catch (...) {
        if (!m_pollFailed)
            PrintCaughtException();
        m_pollFailed = true;
        m_poll.reset();
        Poco::Thread::sleep(POLL_TIMEOUT_MS);
        return false;
    }
}

/// Receives one datagram, if there is one. True when it did: then there may be another. The socket does not
/// block, so while datagrams arrive faster than they are handled, each one costs one system call and not two.
///
/// The set is dropped only when the receive fails, not when Recv throws: a new set needs a descriptor, and
/// Recv may have thrown because there was none.
bool UDPServer::ReceiveOne(Buffer& buffer) {
    bool received = false;
    try {
        buffer.Clear();
        const int bytes = buffer.Receive(m_socket);
        received = bytes >= 0;
        if (received && m_watch != nullptr)
            m_watch->Received(static_cast<std::size_t>(bytes));
        if (bytes >= 1)
            Recv(buffer.Text());
        return received;
    } catch (...) {
        PrintCaughtException();
        if (!received)
            m_poll.reset();
        else if (m_watch != nullptr)
            m_watch->Failed();
        return false;
    }
}

void UDPServer::Stop() {
    if (!m_thread.isRunning())
        return;
    StopSelf();
    m_thread.join();
}

void UDPServer::StopSelf() {
    m_bStop = true;
}
