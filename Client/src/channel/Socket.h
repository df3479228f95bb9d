#pragma once

#include <string_view>

namespace hublink {

/// A socket that is connected to the service's port, so that the system tells when no program has bound it.
///
/// Threads: one at a time.
class Socket {
public:
    enum class Outcome {
        Sent,
        Refused,        ///< No program listens: this datagram is lost.
        RefusedEarlier, ///< The system told it now of an earlier datagram. This one was not sent.
        Full,           ///< The send buffer is.
        TooLong,
        Failed,
    };

    Socket() = default;
    ~Socket() { Close(); }
    Socket(const Socket&) = delete;
    Socket& operator=(const Socket&) = delete;

    /// Sends one datagram, on a new socket where there is none. Never blocks.
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
