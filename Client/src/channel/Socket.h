#pragma once

#include <string_view>

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

    void Close() noexcept;

private:
    bool Open() noexcept;
    void EnlargeSendBuffer() const noexcept;
    int SendOnce(std::string_view datagram) const noexcept;
    int TakeError() const noexcept;
    static Outcome OutcomeOf(int error) noexcept;

    int m_descriptor = -1;
};

} // namespace hublink
