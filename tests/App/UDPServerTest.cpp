#include "App/UDPServer.h"

#include <atomic>
#include <filesystem>
#include <memory>
#include <mutex>
#include <type_traits>
#include <vector>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <Poco/Net/DatagramSocketImpl.h>
#include <Poco/Net/SocketAddress.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/fakes/FakePlugin.h"
#include "tests/support/CapturedOutput.h"
#include "tests/support/Fastest.h"
#include "tests/support/OtherThread.h"
#include "tests/support/ScriptedSleep.h"
#include "tests/support/WaitUntil.h"

using Poco::Net::SocketAddress;
using ::testing::ElementsAre;

namespace {

const std::string LOOPBACK = "127.0.0.1";
constexpr int PORT = 9997;

/// A socket that cannot be bound.
class FailingSocket final : public Poco::Net::DatagramSocket {
public:
    explicit FailingSocket(Throws kind) : DatagramSocket(new Impl(kind)) {}

private:
    class Impl final : public Poco::Net::DatagramSocketImpl {
    public:
        explicit Impl(Throws kind) : m_throws(kind) {}

        using DatagramSocketImpl::bind;
        void bind(const SocketAddress&, bool, bool) override {
            errno = ENOENT;
            ThrowIf(m_throws);
        }

    private:
        const Throws m_throws;
    };
};

class Receiver final : public UDPServer {
public:
    ~Receiver() override { Stop(); }

    bool Recv(const std::string& msg) override {
        {
            const std::lock_guard lock(m_mutex);
            m_received.push_back(msg);
            m_threadId = ::gettid();
        }
        if (msg == "throw Poco")
            ThrowIf(Throws::Poco);
        if (msg == "throw std")
            ThrowIf(Throws::Std);
        if (msg == "throw other") {
            errno = ENOENT;
            ThrowIf(Throws::Other);
        }
        if (msg == "stop self")
            StopSelf();
        if (msg == "close the socket")
            m_socket.close();
        if (msg == "fail the next receive")
            SendToNobody();
        return false; // the server ignores it
    }

    std::vector<std::string> Received() {
        const std::lock_guard lock(m_mutex);
        return m_received;
    }

    using UDPServer::WatchBy;

    bool IsRunning() const { return m_thread.isRunning(); }

    /// Whether the receiving thread sleeps. The thread must have received something before.
    bool WaitsForMore() {
        return FallsAsleep(m_threadId, [] { return false; });
    }

    /// The next Start fails with this kind of exception.
    void LetBindThrow(Throws kind) {
        const FailingSocket socket(kind);
        m_socket = static_cast<const Poco::Net::Socket&>(socket);
    }

    /// For a test that runs the loop on its own thread.
    void Bind() { m_socket.bind(SocketAddress(LOOPBACK, PORT)); }

    void Join() { m_thread.join(); }

    /// Makes the socket's descriptor refer to another file, as a wrong second close by other code would. It
    /// uses bare system calls, because a sanitizer reports this as the mistake that it is.
    void LoseTheSocket() {
        const int other = ::open("/dev/null", O_RDWR | O_CLOEXEC);
        ::syscall(SYS_dup3, other, m_socket.impl()->sockfd(), O_CLOEXEC);
        ::close(other);
    }

    int ReceiveBufferBytes() { return m_socket.getReceiveBufferSize(); }

private:
    /// Sends to a port where no program listens. The kernel answers with an error for the next receive.
    void SendToNobody() {
        Poco::Net::DatagramSocket nobody(SocketAddress(LOOPBACK, 0));
        const SocketAddress address = nobody.address();
        nobody.close();
        m_socket.connect(address);
        m_socket.sendBytes("x", 1);
        const sockaddr disconnected{.sa_family = AF_UNSPEC, .sa_data = {}};
        ::connect(m_socket.impl()->sockfd(), &disconnected, sizeof disconnected);
    }

    std::atomic<pid_t> m_threadId = 0;
    std::mutex m_mutex; ///< Guards the texts.
    std::vector<std::string> m_received;
};

/// A receiver that does not call Stop itself, so that the base class does.
class ReceiverWithoutAStop final : public UDPServer {
public:
    explicit ReceiverWithoutAStop(std::atomic<pid_t>& thread) : m_threadId(thread) {}

    bool Recv(const std::string&) override {
        m_threadId = ::gettid();
        return true;
    }

private:
    std::atomic<pid_t>& m_threadId;
};

/// Records the calls that the receiver makes, as words.
class Watch final : public DatagramWatch {
public:
    void Received(std::size_t bytes) override { Tell(std::to_string(bytes)); }
    void Failed() override { Tell("failed"); }
    void Idle() override { ++m_idle; }

    std::vector<std::string> Told() {
        const std::lock_guard lock(m_mutex);
        return m_told;
    }
    int TimesIdle() const { return m_idle; }

private:
    void Tell(const std::string& word) {
        const std::lock_guard lock(m_mutex);
        m_told.push_back(word);
    }

    std::mutex m_mutex; ///< Guards the words.
    std::vector<std::string> m_told;
    std::atomic<int> m_idle = 0;
};

class TheUDPServer : public ::testing::Test {
protected:
    void Send(const std::string& datagram) {
        m_sender.sendTo(datagram.data(), static_cast<int>(datagram.size()), SocketAddress(LOOPBACK, PORT));
    }

    /// Waits until `count` texts have arrived, and returns all that have.
    std::vector<std::string> Await(std::size_t count) {
        EXPECT_TRUE(WaitUntil([&] { return m_receiver.Received().size() >= count; }));
        return m_receiver.Received();
    }

    CapturedOutput m_output;
    Receiver m_receiver;
    Poco::Net::DatagramSocket m_sender{SocketAddress(LOOPBACK, 0)};
};

} // namespace

static_assert(std::is_abstract_v<UDPServer>);

TEST_F(TheUDPServer, HandsEachDatagramOnAsText) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send("one");
    Send("two");
    EXPECT_THAT(Await(2), ElementsAre("one", "two"));
    m_receiver.Stop();
    EXPECT_EQ(m_output.Text(), "");
}

TEST_F(TheUDPServer, IgnoresADatagramOfNoBytes) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send("");
    Send("after");
    EXPECT_THAT(Await(1), ElementsAre("after"));
}

TEST_F(TheUDPServer, CutsADatagramAtItsFirstZeroByte) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send(std::string("before\0after\0", 13));
    EXPECT_THAT(Await(1), ElementsAre("before"));
}

TEST_F(TheUDPServer, HandsADatagramThatStartsWithAZeroByteOnAsEmptyText) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send(std::string("\0text", 5));
    EXPECT_THAT(Await(1), ElementsAre(""));
}

TEST_F(TheUDPServer, LeavesNothingOfALongDatagramInAShortOneAfterIt) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send(std::string(10240, 'x'));
    Send("short");
    EXPECT_EQ(Await(2)[1], "short");
}

TEST_F(TheUDPServer, TakesADatagramOf10240BytesWhole) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    const std::string whole = std::string(10239, 'x') + "y";
    Send(whole);
    EXPECT_EQ(Await(1)[0], whole);
}

TEST_F(TheUDPServer, CutsLongerDatagramsTo10240Bytes) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send(std::string(10241, 'x'));
    Send(std::string(65507, 'y'));
    const auto received = Await(2);
    EXPECT_EQ(received[0], std::string(10240, 'x'));
    EXPECT_EQ(received[1], std::string(10240, 'y'));
}

TEST_F(TheUDPServer, PrintsAnExceptionOutOfRecvAndGoesOn) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send("throw Poco");
    Send("throw std");
    Send("throw other");
    Send("after");
    Await(4);
    m_receiver.Stop();
    EXPECT_EQ(m_output.Text(), "Poco exception: I/O error: scripted\n"
                               "Std exception: scripted\n"
                               "Unknown exception,eCode:2,desc:No such file or directory\n");
    EXPECT_EQ(m_output.Flushes(), 3);
}

TEST_F(TheUDPServer, NeedsNoDescriptorAfterAnExceptionOutOfRecv) {
#if defined(__SANITIZE_ADDRESS__)
    GTEST_SKIP() << "the sanitizer takes descriptors to look at an exception's type, and finds none without";
#endif
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send("before");
    Await(1);
    rlimit limit{};
    ::getrlimit(RLIMIT_NOFILE, &limit);
    const rlimit none{.rlim_cur = 1, .rlim_max = limit.rlim_max};
    ::setrlimit(RLIMIT_NOFILE, &none);
    Send("throw std");
    Await(2);
    Send("after");
    EXPECT_THAT(Await(3), ElementsAre("before", "throw std", "after"));
    ::setrlimit(RLIMIT_NOFILE, &limit);
    m_receiver.Stop();
    EXPECT_EQ(m_output.Text(), "Std exception: scripted\n");
}

TEST_F(TheUDPServer, TakesDatagramsOfAnyLocalSender) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Poco::Net::DatagramSocket other(SocketAddress("127.0.0.2", 0));
    other.sendTo("from elsewhere", 14, SocketAddress(LOOPBACK, PORT));
    EXPECT_THAT(Await(1), ElementsAre("from elsewhere"));
}

TEST_F(TheUDPServer, PrintsAReceiveThatFailsAndGoesOn) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send("fail the next receive");
    EXPECT_TRUE(WaitUntil([&] { return m_output.Text() == "Poco exception: Connection refused\n"; }))
        << m_output.Text();
    Send("after");
    EXPECT_THAT(Await(2), ElementsAre("fail the next receive", "after"));
}

TEST_F(TheUDPServer, ATakenPortIsPrintedAndStartsNothing) {
    Poco::Net::DatagramSocket other;
    other.bind(SocketAddress(LOOPBACK, PORT), false, false);
    EXPECT_FALSE(m_receiver.Start(LOOPBACK, PORT));
    EXPECT_FALSE(m_receiver.IsRunning());
    EXPECT_EQ(m_output.Text(), "Poco exception: Net Exception: Address already in use: 127.0.0.1:9997\n");
    m_receiver.Stop(); // returns at once: the thread was never started
}

TEST_F(TheUDPServer, AnAddressThatIsNoneIsPrintedAndStartsNothing) {
    EXPECT_FALSE(m_receiver.Start("not an address", PORT));
    EXPECT_FALSE(m_receiver.IsRunning());
    EXPECT_THAT(m_output.Text(), ::testing::StartsWith("Poco exception: "));
}

TEST_F(TheUDPServer, EachKindOfExceptionInStartIsPrintedAndStartsNothing) {
    for (const Throws kind : {Throws::Poco, Throws::Std, Throws::Other}) {
        m_receiver.LetBindThrow(kind);
        EXPECT_FALSE(m_receiver.Start(LOOPBACK, PORT));
        EXPECT_FALSE(m_receiver.IsRunning());
    }
    EXPECT_EQ(m_output.Text(), "Poco exception: I/O error: scripted\n"
                               "Std exception: scripted\n"
                               "Unknown exception,eCode:2,desc:No such file or directory\n");
    EXPECT_EQ(m_output.Flushes(), 3);
}

TEST_F(TheUDPServer, BindsAPortThatAnotherReceiverHolds) {
    Receiver other;
    ASSERT_TRUE(other.Start(LOOPBACK, PORT));
    EXPECT_TRUE(m_receiver.Start(LOOPBACK, PORT)) << "a restarted service must not wait for its predecessor";
}

TEST_F(TheUDPServer, BindsBesideASocketThatHasEitherKindOfReuse) {
    for (const bool address : {true, false}) {
        Poco::Net::DatagramSocket other;
        other.bind(SocketAddress(LOOPBACK, PORT), address, !address);
        Receiver receiver;
        EXPECT_TRUE(receiver.Start(LOOPBACK, PORT)) << (address ? "of the address" : "of the port");
    }
}

TEST_F(TheUDPServer, StopBeforeStartReturns) {
    m_receiver.Stop();
    EXPECT_FALSE(m_receiver.IsRunning());
}

TEST_F(TheUDPServer, StopsWithin300MillisecondsWhileIdle) {
    std::unique_ptr<Receiver> receiver;
    const auto startAndIdle = [&] {
        receiver.reset();
        receiver = std::make_unique<Receiver>();
        ASSERT_TRUE(receiver->Start(LOOPBACK, PORT));
        Send("the loop runs");
        ASSERT_TRUE(WaitUntil([&] { return receiver->Received().size() == 1; }));
        ASSERT_TRUE(receiver->WaitsForMore());
    };
    EXPECT_TRUE(CanEndWithin(std::chrono::milliseconds(300), startAndIdle, [&] { receiver->Stop(); }));
    EXPECT_FALSE(receiver->IsRunning());
}

TEST_F(TheUDPServer, DestructionEndsTheThread) {
    std::atomic<pid_t> thread = 0;
    auto receiver = std::make_unique<ReceiverWithoutAStop>(thread);
    ASSERT_TRUE(receiver->Start(LOOPBACK, PORT));
    Send("the loop runs");
    ASSERT_TRUE(WaitUntil([&] { return thread != 0; }));
    receiver.reset();
    EXPECT_FALSE(std::filesystem::exists("/proc/self/task/" + std::to_string(thread)));
}

TEST_F(TheUDPServer, ASecondStopReturns) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    m_receiver.Stop();
    m_receiver.Stop();
    EXPECT_FALSE(m_receiver.IsRunning());
}

TEST_F(TheUDPServer, StopSelfEndsTheLoopFromWithin) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send("stop self");
    m_receiver.Join();
    EXPECT_FALSE(m_receiver.IsRunning());
    EXPECT_THAT(m_receiver.Received(), ElementsAre("stop self"));
}

TEST_F(TheUDPServer, AStopBeforeTheLoopBeganLetsItReturnAtOnce) {
    m_receiver.Bind();
    Send("waiting");
    m_receiver.StopSelf();
    m_receiver.run(); // runs on the test's thread
    EXPECT_THAT(m_receiver.Received(), ElementsAre()) << "not even for what waits";
}

TEST_F(TheUDPServer, PrintsAPollThatKeepsFailingOnceAndCanStillBeStopped) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send("close the socket");
    EXPECT_TRUE(WaitUntil([] { return Pauses().size() >= 3; })) << "the poll fails again and again";
    m_receiver.Stop();
    EXPECT_EQ(m_output.Text(), "Poco exception: Invalid socket\n"
                               "Poco exception: I/O error: Bad socket descriptor\n")
        << "the receive that failed, and the polls, once";
    EXPECT_THAT(Pauses(), ::testing::Each(250)) << "each failure waits out the time that it did not poll";
    EXPECT_FALSE(m_receiver.IsRunning());
}

TEST_F(TheUDPServer, PrintsASocketThatIsLostWithoutAWordOnce) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send("before");
    Await(1);
    m_receiver.LoseTheSocket();
    EXPECT_TRUE(WaitUntil([] { return Pauses().size() >= 2; }));
    m_receiver.Stop();
    EXPECT_EQ(m_output.Text(), "Poco exception: I/O error: 1\n");
}

TEST_F(TheUDPServer, HasTheLargestReceiveBufferThatTheKernelGrants) {
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Poco::Net::DatagramSocket asked(SocketAddress(LOOPBACK, 0));
    asked.setReceiveBufferSize(8 * 1024 * 1024);
    EXPECT_EQ(m_receiver.ReceiveBufferBytes(), asked.getReceiveBufferSize());
}

TEST_F(TheUDPServer, TellsItsWatchOfEachDatagramAlsoOfWhatGoesNoFurther) {
    Watch watch;
    m_receiver.WatchBy(watch);
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send("");
    Send("throw std");
    Send(std::string(10239, 'x'));
    Send(std::string(20000, 'x'));
    Await(3);
    EXPECT_THAT(watch.Told(), ElementsAre("0", "9", "failed", "10239", "10240"));
    m_receiver.Stop();
}

TEST_F(TheUDPServer, TellsItsWatchWhenNothingComes) {
    Watch watch;
    m_receiver.WatchBy(watch);
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    EXPECT_TRUE(WaitUntil([&] { return watch.TimesIdle() >= 2; }));
    m_receiver.Stop();
    EXPECT_THAT(watch.Told(), ElementsAre());
}

TEST_F(TheUDPServer, TellsNobodyOfAReceiveThatFailed) {
    Watch watch;
    m_receiver.WatchBy(watch);
    ASSERT_TRUE(m_receiver.Start(LOOPBACK, PORT));
    Send("fail the next receive");
    Await(1);
    Send("after");
    Await(2);
    EXPECT_THAT(watch.Told(), ElementsAre("21", "5"));
    m_receiver.Stop();
}
