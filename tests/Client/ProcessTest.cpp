#include <atomic>
#include <thread>

#include <arpa/inet.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <hublink/report.h>
#include <hublink/report.hpp>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/Client/CountedMemory.h"
#include "tests/Client/ScriptedClock.h"
#include "tests/Client/ServicePort.h"
#include "tests/support/TemporaryDirectory.h"

using hublink::Result;
using ::testing::ElementsAre;
using ::testing::SizeIs;
using ::testing::StartsWith;

// What a program may do while it has a reporter: use many threads, fork, close descriptors that it does not
// own, run out of memory.

namespace {

class ClientInItsProcess : public ::testing::Test {
protected:
    /// The result that `child` returns in a forked process. The process must end by itself.
    template <typename Child>
    static Result ResultInChild(Child child) {
        const pid_t process = ::fork();
        if (process == 0)
            ::_exit(static_cast<int>(child()));
        int status = 0;
        ::waitpid(process, &status, 0);
        EXPECT_TRUE(WIFEXITED(status));
        return static_cast<Result>(WEXITSTATUS(status));
    }

    /// The descriptor that the reporter opens for its first event: the one that is connected to the service's
    /// port.
    int DescriptorOfTheReporter() {
        constexpr int MOST_DESCRIPTORS = 256;
        EXPECT_EQ(m_reporter.Event("B1"), Result::Sent);
        for (int descriptor = 0; descriptor < MOST_DESCRIPTORS; ++descriptor) {
            sockaddr_in peer{};
            socklen_t length = sizeof peer;
            if (::getpeername(descriptor, reinterpret_cast<sockaddr*>(&peer), &length) == 0 &&
                peer.sin_port == htons(9997))
                return descriptor;
        }
        ADD_FAILURE() << "no such descriptor";
        return -1;
    }

    ServicePort m_port;
    hublink::Reporter m_reporter{hublink::Module{"A100", "2.1", "Painter"}};
};

} // namespace

TEST_F(ClientInItsProcess, AnEventTakesNoMemory) {
    const std::string text(5000, '\'');
    m_reporter.Event("A100|0");
    const auto before = CountedMemory::allocations;
    EXPECT_EQ(m_reporter.Event("B1", text), Result::Sent);
    EXPECT_EQ(m_reporter.Event("A100|1", hublink::Json{R"({"a":[1,2,{"b":"c"}]})"}), Result::Sent);
    EXPECT_EQ(CountedMemory::allocations, before);
}

TEST_F(ClientInItsProcess, WithoutMemoryThereIsAResultAndNoException) {
    const hublink::Module module{std::string(1000, 'A'), "1", "x"};
    CountedMemory::isUsedUp = true;
    hublink::Reporter reporter(module);
    hublink_reporter* const inC = hublink_reporter_new("A100", "1", "x");
    const Result user = m_reporter.SetUser("u1");
    CountedMemory::isUsedUp = false;
    EXPECT_EQ(user, Result::SystemError);
    EXPECT_EQ(reporter.Event("B1"), Result::SystemError);
    EXPECT_EQ(reporter.SetUser("u1"), Result::SystemError);
    EXPECT_EQ(reporter.Count(Result::SystemError), 0U);
    EXPECT_EQ(inC, nullptr);
    EXPECT_EQ(m_reporter.Event("B1"), Result::Sent);
}

TEST_F(ClientInItsProcess, NullPointersInCAreAnswered) {
    EXPECT_EQ(hublink_reporter_event(nullptr, "B1", "x"), HUBLINK_SYSTEM_ERROR);
    EXPECT_EQ(hublink_reporter_event_json(nullptr, "B1", "{}"), HUBLINK_SYSTEM_ERROR);
    EXPECT_EQ(hublink_reporter_set_user(nullptr, "u1", ""), HUBLINK_SYSTEM_ERROR);
    EXPECT_EQ(hublink_reporter_count(nullptr, HUBLINK_SENT), 0U);
    hublink_reporter_free(nullptr);

    hublink_reporter* const reporter = hublink_reporter_new(nullptr, nullptr, nullptr);
    EXPECT_EQ(hublink_reporter_event(reporter, nullptr, "x"), HUBLINK_INVALID_EVENT_ID);
    EXPECT_EQ(hublink_reporter_event(reporter, "B1", nullptr), HUBLINK_SENT);
    EXPECT_EQ(hublink_reporter_event_json(reporter, "A759|1", nullptr), HUBLINK_SENT);
    EXPECT_EQ(hublink_reporter_set_user(reporter, nullptr, nullptr), HUBLINK_INVALID_TEXT);
    EXPECT_EQ(hublink_reporter_set_user(reporter, "u1", nullptr), HUBLINK_SENT);
    EXPECT_EQ(hublink_reporter_count(reporter, HUBLINK_SENT), 3U);
    hublink_reporter_free(reporter);
    EXPECT_THAT(m_port.Take(), SizeIs(3));
    EXPECT_STREQ(hublink_result_name(HUBLINK_QUOTE_IN_USER), "QuoteInUser");
}

TEST_F(ClientInItsProcess, AChildSendsOverASocketOfItsOwn) {
    const int parents = DescriptorOfTheReporter();
    m_port.Take();
    EXPECT_EQ(ResultInChild([&] {
                  if (::fcntl(parents, F_GETFD) != -1)
                      return Result::SystemError;
                  return m_reporter.Event("B2");
              }),
              Result::Sent);
    EXPECT_EQ(m_reporter.Event("B3"), Result::Sent);
    EXPECT_THAT(m_port.Take(),
                ElementsAre(StartsWith(R"({"eventID":"B2")"), StartsWith(R"({"eventID":"B3")")));
}

TEST_F(ClientInItsProcess, AForkMayFallIntoTheEventsOfOtherThreads) {
    std::atomic<bool> stop = false;
    std::vector<std::thread> threads;
    for (int i = 0; i < 3; ++i)
        threads.emplace_back([&] {
            while (!stop)
                m_reporter.Event("B1");
        });
    threads.emplace_back([&] { // and during the construction and destruction of a reporter
        while (!stop)
            hublink::Reporter().Event("B1");
    });
    for (int i = 0; i < 50; ++i)
        EXPECT_EQ(ResultInChild([&] { return m_reporter.Event("B2"); }), Result::Sent);
    stop = true;
    for (auto& thread : threads)
        thread.join();
}

TEST_F(ClientInItsProcess, ADescriptorThatTheProgramClosedIsReplaced) {
    ::close(DescriptorOfTheReporter());
    EXPECT_EQ(m_reporter.Event("B2"), Result::Sent);
    EXPECT_THAT(m_port.Take(), SizeIs(2));
}

TEST_F(ClientInItsProcess, ADescriptorThatTheProgramUsesForAFileIsLeftAlone) {
    const TemporaryDirectory directory;
    const int reporters = DescriptorOfTheReporter();
    const int file = ::open((directory.Path() + "/file").c_str(), O_RDWR | O_CREAT, 0600);
    ASSERT_EQ(::dup2(file, reporters), reporters);
    EXPECT_EQ(m_reporter.Event("B2"), Result::Sent);
    EXPECT_THAT(m_port.Take(), SizeIs(2));
    EXPECT_EQ(::lseek(reporters, 0, SEEK_END), 0) << "still open, and nothing was written to it";
    ::close(reporters);
    ::close(file);
}

TEST_F(ClientInItsProcess, ANumberThatAnotherSocketOfTheProgramGotIsGivenUpWithinASecond) {
    Poco::Net::DatagramSocket others(Poco::Net::SocketAddress("127.0.0.1", 9998));
    Poco::Net::DatagramSocket connected;
    connected.connect(others.address());
    const int number = DescriptorOfTheReporter();
    ASSERT_EQ(::dup2(connected.impl()->sockfd(), number), number);
    AdvanceSteadyClock(std::chrono::seconds(1));
    EXPECT_EQ(m_reporter.Event("B2"), Result::Sent);
    EXPECT_THAT(m_port.Take(), SizeIs(2));
    EXPECT_EQ(others.available(), 0);
    EXPECT_EQ(::close(number), 0) << "it was left open";
}

TEST_F(ClientInItsProcess, EightThreadsShareAReporter) {
    constexpr std::uint64_t EVENTS = 100'000;
    constexpr std::uint64_t THREADS = 8;
    std::vector<std::thread> threads;
    for (std::uint64_t i = 0; i < THREADS; ++i)
        threads.emplace_back([&] {
            for (std::uint64_t event = 0; event < EVENTS; ++event)
                m_reporter.Event("A100|1", hublink::Json{"{}"});
            m_reporter.SetUser("u1");
        });
    for (auto& thread : threads)
        thread.join();
    EXPECT_EQ(m_reporter.Count(Result::Sent), THREADS * (EVENTS + 1))
        << "what the port's buffer drops is sent, too";
    EXPECT_THAT(m_port.Take().front(), StartsWith(R"({"msgType":"init")"));
}
