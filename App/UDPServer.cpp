#include "App/UDPServer.h"

#include <array>
#include <cstdint>
#include <exception>
#include <iostream>

#include <Poco/Error.h>
#include <Poco/Exception.h>
#include <Poco/Net/SocketAddress.h>
#include <Poco/Timespan.h>

#include "Common/Constants.h" // and no more of Common: the rest brings the logger

namespace {

constexpr long POLL_TIMEOUT_MS = 250; // how long a stop may take; spares the loop a socket to be woken by

/// What is asked of the kernel. Its default holds some hundred datagrams, which a burst fills while this
/// thread waits for a processor.
constexpr int SOCKET_BUFFER_BYTES = 8 * 1024 * 1024;

/// Prints the exception under way. Throws when there is no memory for its text; a line is printed whole or
/// not at all.
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

/// For `catch (...)`: prints the exception under way; where its text cannot be built, the reason for that.
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

/// What a datagram is received into. The byte behind the last is always zero, so that a datagram which fills
/// the buffer ends somewhere too.
class UDPServer::Buffer {
public:
    void Clear() { m_bytes.fill('\0'); }
    char* Data() { return m_bytes.data(); }

    /// The bytes up to the first zero byte.
    std::string Text() const { return m_bytes.data(); }

    Poco::Net::SocketAddress m_sender; ///< Not checked: every program of this machine may send.

private:
    std::array<char, Wire::MAX_BYTES + 1> m_bytes{};
};

UDPServer::~UDPServer() {
    Stop();
}

bool UDPServer::Start(const std::string& ip, int port) {
    try {
        const Poco::Net::SocketAddress address(ip, static_cast<std::uint16_t>(port));
        // Both kinds of reuse, so that a service which was just restarted can bind at once.
        m_socket.bind(address, true, true);
        // And then not of the address any more: with that, a later socket of any user could bind the same
        // address, and the kernel would hand the datagrams to that one. The port is still reused by sockets
        // of this user alone, so the next service binds at once.
        m_socket.setReuseAddress(false);
        try {
            m_socket.setReceiveBufferSize(SOCKET_BUFFER_BYTES);
        } catch (const Poco::Exception&) { // what the kernel grants is enough to run with
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

/// Whether a datagram came within the poll timeout. By a set that lasts: the socket's own poll makes, fills,
/// waits for and closes one each time, which is four system calls instead of one.
///
/// A poll that fails (a closed socket) would fail again at once and for ever: it is printed when it begins,
/// and each one waits out the timeout that it did not use.
bool UDPServer::WaitForDatagram() {
    const Poco::Timespan timeout(POLL_TIMEOUT_MS * Poco::Timespan::MILLISECONDS);
    try {
        if (!m_poll)
            m_poll.emplace().add(m_socket, Poco::Net::PollSet::POLL_READ);
        const bool readable = !m_poll->poll(timeout).empty();
        if (!readable)
            m_poll->add(m_socket, Poco::Net::PollSet::POLL_READ); // throws when the kernel dropped it
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

/// Whether there was a datagram, so that there may be another one. The socket does not block: while datagrams
/// come faster than they are handled, each costs one system call and not two.
///
/// Only a receive that fails drops the set: another one takes a descriptor, which what Recv threw may be the
/// lack of.
bool UDPServer::ReceiveOne(Buffer& buffer) {
    bool received = false;
    try {
        buffer.Clear();
        const int bytes = m_socket.receiveFrom(buffer.Data(), Wire::MAX_BYTES, buffer.m_sender);
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
