#pragma once

#include <string_view>

#include <sys/types.h>

namespace hublink {

/// A socket that is connected to the service's port. It is connected because the system would not report to
/// an unconnected socket that no program has bound the port.
///
/// Threads: one at a time.
class Socket {
public:
    enum class Outcome {
        Sent,
        Refused,        ///< No program listens: this datagram is lost.
        RefusedEarlier, ///< The system reports the refusal of an earlier datagram; it did not send this one.
        Full,           ///< The send buffer is full.
        TooLong,
        Failed,
    };

    Socket() = default;
    ~Socket() { Close(); }
    Socket(const Socket&) = delete;
    Socket& operator=(const Socket&) = delete;

    /// Sends one datagram. Opens the socket first when it is not open. Never blocks.
    Outcome Send(std::string_view datagram) noexcept;

    /// Looks whether our descriptor's number belongs to another file or socket of the program now: the
    /// program closed our descriptor and opened something else. The next Send then opens another socket.
    void GiveUpAReusedNumber() noexcept;

    void Close() noexcept;

private:
    bool Open() noexcept;
    void EnlargeSendBuffer() const noexcept;
    int SendOnce(std::string_view datagram) const noexcept;
    int TakeError() const noexcept;
    static Outcome OutcomeOf(int error) noexcept;

    int m_descriptor = -1;
    ino_t m_inode = 0; ///< Of our socket, which no other open socket of the machine has.
};

} // namespace hublink
