#include "App/UDPServer.h"

#include <atomic>
#include <cerrno>
#include <csignal>
#include <string>
#include <vector>

#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <Poco/Net/SocketAddress.h>
#include <gtest/gtest.h>

#include "tests/support/CapturedOutput.h"
#include "tests/support/OtherUser.h"
#include "tests/support/WaitUntil.h"

// Which other programs may bind the report port. The options of a socket decide that, together with those of
// the sockets that share the port.

namespace {

const std::string LOOPBACK = "127.0.0.1";
constexpr int PORT = 9997;
const std::string REPORT = "report";
const std::string LAST_REPORT = "last report";

class Receiver final : public UDPServer {
public:
    ~Receiver() override { Stop(); }

    bool Recv(const std::string& msg) override {
        ++m_received;
        if (msg == LAST_REPORT)
            StopSelf(); // so that Stop need not wait for the end of the poll
        return true;
    }

    int Received() const { return m_received; }

private:
    std::atomic<int> m_received = 0;
};

/// How a program may try to bind a port that is already bound.
struct Attempt {
    const char* what;
    std::vector<int> options; ///< Options of level SOL_SOCKET, each set to 1.
    const char* address;      ///< A socket with an IPv6 address also receives datagrams of IPv4.
    /// Bound to this device first: the kernel prefers such a socket to others.
    const char* device = "";
};

const std::vector<Attempt> ATTEMPTS = {
    {"no option", {}, "127.0.0.1"},
    {"the address", {SO_REUSEADDR}, "127.0.0.1"},
    {"the port", {SO_REUSEPORT}, "127.0.0.1"},
    {"both", {SO_REUSEADDR, SO_REUSEPORT}, "127.0.0.1"},
    {"both, on the device", {SO_REUSEADDR, SO_REUSEPORT}, "127.0.0.1", "lo"},
    {"both, of every address", {SO_REUSEADDR, SO_REUSEPORT}, "0.0.0.0"},
    {"both, of every address on the device", {SO_REUSEADDR, SO_REUSEPORT}, "0.0.0.0", "lo"},
    {"both, by IPv6", {SO_REUSEADDR, SO_REUSEPORT}, "::ffff:127.0.0.1"},
    {"both, of every address by IPv6", {SO_REUSEADDR, SO_REUSEPORT}, "::"},
};

/// Tries to bind. The error of the bind; 0 when it succeeded; -1 when an earlier step failed. The socket
/// stays open.
int Try(const Attempt& attempt) {
    const Poco::Net::SocketAddress address(attempt.address, PORT);
    const int socket = ::socket(address.af(), SOCK_DGRAM | SOCK_CLOEXEC, 0);
    const auto set = [socket](int level, int option, int value) {
        return ::setsockopt(socket, level, option, &value, sizeof value) == 0;
    };
    for (const int option : attempt.options)
        if (!set(SOL_SOCKET, option, 1))
            return -1;
    if (address.af() == AF_INET6 && !set(IPPROTO_IPV6, IPV6_V6ONLY, 0))
        return -1;
    const std::string device = attempt.device;
    if (::setsockopt(socket, SOL_SOCKET, SO_BINDTODEVICE, device.data(),
                     static_cast<socklen_t>(device.size())) != 0)
        return -1;
    return ::bind(socket, address.addr(), address.length()) == 0 ? 0 : errno;
}

/// A process of another user that tries to bind, and keeps its socket until the destructor ends it.
class AnotherUser {
public:
    explicit AnotherUser(const Attempt& attempt) {
        int told[2];
        EXPECT_EQ(::pipe(told), 0);
        m_process = ::fork();
        if (m_process == 0) {
            const int error = ::setuid(OtherUser::ID) == 0 ? Try(attempt) : EPERM;
            if (::write(told[1], &error, sizeof error) == sizeof error)
                ::pause();
            ::_exit(0);
        }
        EXPECT_EQ(::read(told[0], &m_error, sizeof m_error), static_cast<ssize_t>(sizeof m_error));
        ::close(told[0]);
        ::close(told[1]);
    }
    ~AnotherUser() {
        ::kill(m_process, SIGKILL);
        ::waitpid(m_process, nullptr, 0);
    }
    AnotherUser(const AnotherUser&) = delete;
    AnotherUser& operator=(const AnotherUser&) = delete;

    /// The error of its bind; 0 when it succeeded.
    int Error() const { return m_error; }

private:
    pid_t m_process = -1;
    int m_error = -1;
};

class SharedPort : public ::testing::Test {
protected:
    void Send(const std::string& report) {
        m_sender.sendTo(report.data(), static_cast<int>(report.size()),
                        Poco::Net::SocketAddress(LOOPBACK, PORT));
    }

    CapturedOutput m_output;
    Receiver m_receiver;
    Poco::Net::DatagramSocket m_sender{Poco::Net::SocketAddress(LOOPBACK, 0)};
};

} // namespace

TEST_F(SharedPort, IsRefusedToAnotherUserWhateverHeAsksFor) {
    if (!OtherUser::Does([] { return true; }))
        GTEST_SKIP() << "needs the rights to become another user";
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    for (const Attempt& attempt : ATTEMPTS) {
        SCOPED_TRACE(attempt.what);
        const AnotherUser other(attempt);
        EXPECT_EQ(other.Error(), EADDRINUSE);
        const int before = m_receiver.Received();
        for (int i = 0; i < 20; ++i)
            Send(REPORT);
        EXPECT_TRUE(WaitUntil([&] { return m_receiver.Received() == before + 20; }, std::chrono::seconds(2)))
            << m_receiver.Received() - before << " of 20 arrived";
    }
}

TEST_F(SharedPort, IsBoundBesideAProgramThatLetsTheAddressBeReusedAndNoMore) {
    ASSERT_EQ(Try({"the address", {SO_REUSEADDR}, "127.0.0.1"}), 0);
    EXPECT_TRUE(m_receiver.Start(LOOPBACK, PORT)) << m_output.Text();
}

TEST_F(SharedPort, GivesTheServiceEveryReportBesideAnEarlierSocketOfAnotherUserThatLetsTheAddressBeReused) {
    if (!OtherUser::Does([] { return true; }))
        GTEST_SKIP() << "needs the rights to become another user";
    const AnotherUser other({"the address", {SO_REUSEADDR}, "127.0.0.1"});
    ASSERT_EQ(other.Error(), 0);
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT)) << m_output.Text();
    for (int i = 0; i < 20; ++i)
        Send(REPORT);
    EXPECT_TRUE(WaitUntil([&] { return m_receiver.Received() == 20; }, std::chrono::seconds(2)))
        << m_receiver.Received() << " of 20 arrived";
}

TEST_F(SharedPort, IsBoundAtOnceWhileTheOldProcessIsBeingKilled) {
    for (int i = 0; i < 20; ++i) {
        int bound[2];
        ASSERT_EQ(::pipe(bound), 0);
        const pid_t old = ::fork();
        if (old == 0) {
            Receiver receiver;
            const char success = receiver.Start(LOOPBACK, PORT) ? 1 : 0;
            if (::write(bound[1], &success, 1) == 1)
                ::pause();
            ::_exit(0);
        }
        char success = 0;
        ASSERT_EQ(::read(bound[0], &success, 1), 1);
        ASSERT_EQ(success, 1);
        Receiver restarted;
        ::kill(old, SIGKILL);
        EXPECT_TRUE(restarted.Start(LOOPBACK, PORT)) << m_output.Text();
        ::waitpid(old, nullptr, 0);
        Send(LAST_REPORT);
        EXPECT_TRUE(WaitUntil([&] { return restarted.Received() == 1; }));
        ::close(bound[0]);
        ::close(bound[1]);
    }
}
