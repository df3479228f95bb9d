#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include <Poco/Net/DatagramSocket.h>
#include <Poco/Net/PollSet.h>
#include <Poco/Runnable.h>
#include <Poco/Thread.h>

/// An observer of the receiver: it gets the receiver's events that the texts do not show. All calls come on
/// the receiving thread. An implementation must not throw and must not wait.
class DatagramWatch {
public:
    virtual ~DatagramWatch() = default;

    /// A datagram of `bytes` bytes was taken from the socket. An empty datagram is reported here too, but is
    /// not passed to Recv.
    virtual void Received(std::size_t bytes) = 0;

    /// The datagram that was received last is lost, because an exception was thrown while it was handled.
    virtual void Failed() = 0;

    /// No datagram came within a poll's timeout.
    virtual void Idle() = 0;
};

/// Receives datagrams on a thread of its own and passes each one, as text, to Recv. It knows nothing of their
/// meaning.
///
/// Life: constructed → started (Start returned true) → stopping → joined. There is no restart.
///
/// Threads: Recv runs on the receiving thread, everything else on the owner's. A derived class must call Stop
/// in its own destructor: after that destructor, there is no Recv that the receiving thread could call.
///
/// Failure: is printed to standard output and never logged, because the receiver must be able to report a
/// failure without a logger.
class UDPServer : public Poco::Runnable {
public:
    UDPServer() = default;
    UDPServer(const UDPServer&) = delete;
    UDPServer& operator=(const UDPServer&) = delete;

    /// Calls Stop. An exception on the way ends the process.
    ~UDPServer() override;

    /// The receive loop; returns when a stop is asked for.
    void run() override;

    /// Binds `ip` and `port` and starts the thread. On failure it prints why and returns false; no thread is
    /// running then.
    bool Start(const std::string& ip, int port);

    /// Stops the loop and joins its thread. It waits at most for the current Recv and one poll timeout (250
    /// ms). Returns at once when nothing runs. The receiving thread must not call it: see StopSelf.
    void Stop();

    /// Asks the loop to end and does not wait for that. Recv may call it.
    void StopSelf();

protected:
    /// Called once for each datagram, with its bytes up to the first zero byte, at most 10240. An empty
    /// datagram is not passed on. The result is ignored. An exception loses this datagram only.
    virtual bool Recv(const std::string& msg) = 0;

    /// Reports to `watch` from now on. `watch` must live as long as the receiver runs. To be called before
    /// Start.
    void WatchBy(DatagramWatch& watch) { m_watch = &watch; }

    Poco::Thread m_thread;
    Poco::Net::DatagramSocket m_socket;

private:
    class Buffer;

    bool WaitForDatagram();
    bool ReceiveOne(Buffer& buffer);

    /// A plain bool on purpose: the stopping thread writes it once, the loop reads it once in each pass, and
    /// the join orders everything else. At worst, the race costs one more pass.
    bool m_bStop = false;

    /// Made at the first poll, and made again after a failure. When the socket is closed, the kernel removes
    /// it from the set silently.
    std::optional<Poco::Net::PollSet> m_poll;

    /// Whether the last poll failed. With it, a socket that stays broken is reported only once.
    bool m_pollFailed = false;

    DatagramWatch* m_watch = nullptr; ///< Not owned; may be null.
};
