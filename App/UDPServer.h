#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include <Poco/Net/DatagramSocket.h>
#include <Poco/Net/PollSet.h>
#include <Poco/Runnable.h>
#include <Poco/Thread.h>

/// Is told what the receiver sees and its texts do not show. All of it on the receiving thread, and none of
/// it may throw or wait.
class DatagramWatch {
public:
    virtual ~DatagramWatch() = default;

    /// A datagram of so many bytes was taken from the socket, also one of none, which goes no further.
    virtual void Received(std::size_t bytes) = 0;

    /// An exception cost the datagram that was received last.
    virtual void Failed() = 0;

    /// No datagram came within a poll's timeout.
    virtual void Idle() = 0;
};

/// Receives datagrams on a thread of its own and hands each one, as text, to Recv. Knows nothing of what they
/// mean.
///
/// Life: constructed → started (Start returned true) → stopping → joined. There is no restart.
///
/// Threads: Recv runs on the receiving thread, everything else on the owner's. A derived class stops in its
/// own destructor: once that has run, the receiving thread has no Recv to call any more.
///
/// Failure: goes to standard output, never to the log; the receiver must be able to complain without a
/// logger.
class UDPServer : public Poco::Runnable {
public:
    UDPServer() = default;
    UDPServer(const UDPServer&) = delete;
    UDPServer& operator=(const UDPServer&) = delete;

    /// As Stop. An exception on the way ends the process.
    ~UDPServer() override;

    /// The receive loop; returns when a stop is asked for.
    void run() override;

    /// Binds `ip` and `port` and starts the thread. False after printing why that failed; nothing is running
    /// then.
    bool Start(const std::string& ip, int port);

    /// Stops the loop and joins its thread, which takes one poll timeout (250 ms) at the most beside the Recv
    /// under way. Returns at once when nothing runs. Not for the receiving thread itself: see StopSelf.
    void Stop();

    /// Asks the loop to end and does not wait; may be called by Recv.
    void StopSelf();

protected:
    /// Called once for each datagram: its bytes up to the first zero byte, 10240 at the most. The result is
    /// ignored, and an exception costs this datagram only.
    virtual bool Recv(const std::string& msg) = 0;

    /// Tells `watch` from now on, which must live as long as the receiver runs. Before Start.
    void WatchBy(DatagramWatch& watch) { m_watch = &watch; }

    Poco::Thread m_thread;
    Poco::Net::DatagramSocket m_socket;

private:
    class Buffer;

    bool WaitForDatagram();
    bool ReceiveOne(Buffer& buffer);

    /// Plain on purpose: the stopping thread writes it once, the loop reads it once a pass, and the join
    /// orders the rest. The worst that the race can cost is one more pass.
    bool m_bStop = false;

    /// Made when it is first needed, and anew after a failure. The kernel drops a socket that is closed from
    /// it, and says nothing.
    std::optional<Poco::Net::PollSet> m_poll;

    /// Whether the last poll failed, so that a socket that stays broken is reported once.
    bool m_pollFailed = false;

    DatagramWatch* m_watch = nullptr; ///< Not owned; may be null.
};
