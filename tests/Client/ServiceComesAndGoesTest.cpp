#include <cerrno>
#include <cstdlib>
#include <optional>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <hublink/report.hpp>
#include <sys/resource.h>
#include <unistd.h>

#include "tests/Client/ScriptedClock.h"
#include "tests/Client/ScriptedSend.h"
#include "tests/Client/ServicePort.h"
#include "tests/support/WaitUntil.h"

using hublink::Result;
using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::StartsWith;

namespace {

const auto USER = HasSubstr("updateOpenID");
const auto INIT = HasSubstr("\"msgType\":\"init\"");

auto EventWithId(const std::string& id) {
    return StartsWith("{\"eventID\":\"" + id + "\"");
}

/// Changes the program that listens on the service's port.
class ServiceComesAndGoes : public ::testing::Test {
protected:
    std::optional<ServicePort> m_port;
    hublink::Reporter m_reporter{hublink::Module{"A100", "2.1", "Painter"}};
};

/// Binds the port as another user while this object exists. Works with root's rights only.
class OtherUser {
public:
    OtherUser() : m_isOther(::seteuid(12'345) == 0) {
        if (!m_isOther)
            return;
        m_port.emplace();
        EXPECT_EQ(::seteuid(0), 0);
    }
    bool IsOther() const { return m_isOther; }
    ServicePort& Port() { return *m_port; }

private:
    const bool m_isOther;
    std::optional<ServicePort> m_port;
};

/// The program can open no file while this object exists.
class NoFreeDescriptor {
public:
    NoFreeDescriptor() {
        EXPECT_EQ(::getrlimit(RLIMIT_NOFILE, &m_before), 0);
        const rlimit none{0, m_before.rlim_max};
        EXPECT_EQ(::setrlimit(RLIMIT_NOFILE, &none), 0);
    }
    ~NoFreeDescriptor() { EXPECT_EQ(::setrlimit(RLIMIT_NOFILE, &m_before), 0); }
    NoFreeDescriptor(const NoFreeDescriptor&) = delete;
    NoFreeDescriptor& operator=(const NoFreeDescriptor&) = delete;

private:
    rlimit m_before{};
};

} // namespace

TEST_F(ServiceComesAndGoes, NobodyListensUntilTheServiceIsThere) {
    EXPECT_EQ(m_reporter.Event("B1"), Result::NobodyListens);
    EXPECT_EQ(m_reporter.Event("A100|1"), Result::NobodyListens);
    m_port.emplace();
    EXPECT_EQ(m_reporter.Event("B2"), Result::Sent);
    EXPECT_EQ(m_reporter.Event("A100|2"), Result::Sent);
    EXPECT_THAT(m_port->Take(), ElementsAre(EventWithId("B2"), INIT, EventWithId("A100|2")));
    EXPECT_EQ(m_reporter.Count(Result::NobodyListens), 2U);
}

TEST_F(ServiceComesAndGoes, ModuleAndUserAreToldAgainOnceItWasFoundGone) {
    m_port.emplace();
    EXPECT_EQ(m_reporter.SetUser("u1"), Result::Sent);
    EXPECT_EQ(m_reporter.Event("A100|1"), Result::Sent);
    m_port.reset();
    EXPECT_EQ(m_reporter.Event("A100|2"), Result::NobodyListens);
    m_port.emplace();
    EXPECT_EQ(m_reporter.Event("B3"), Result::Sent);
    EXPECT_EQ(m_reporter.Event("A100|4"), Result::Sent);
    EXPECT_EQ(m_reporter.Event("A100|5"), Result::Sent);
    EXPECT_THAT(m_port->Take(),
                ElementsAre(USER, EventWithId("B3"), INIT, EventWithId("A100|4"), EventWithId("A100|5")));
}

TEST_F(ServiceComesAndGoes, ModuleAndUserAreToldAgainWithinSecondsOfAnUnnoticedRestart) {
    m_port.emplace();
    EXPECT_EQ(m_reporter.SetUser("u1"), Result::Sent);
    EXPECT_EQ(m_reporter.Event("A100|1"), Result::Sent);
    m_port.reset();
    m_port.emplace();
    std::vector<std::string> texts;
    EXPECT_TRUE(WaitUntil(
        [&] {
            EXPECT_EQ(m_reporter.Event("A100|2"), Result::Sent);
            texts = m_port->Take();
            return texts.size() > 1;
        },
        std::chrono::seconds(5)));
    EXPECT_THAT(texts, ElementsAre(USER, INIT, EventWithId("A100|2")));
}

TEST_F(ServiceComesAndGoes, AUserThatCouldNotBeToldIsToldBeforeTheNextEvent) {
    EXPECT_EQ(m_reporter.SetUser("u1"), Result::NobodyListens);
    m_port.emplace();
    EXPECT_EQ(m_reporter.Event("B1"), Result::Sent);
    EXPECT_THAT(m_port->Take(), ElementsAre(AllOf(USER, HasSubstr("u1")), EventWithId("B1")));
}

TEST_F(ServiceComesAndGoes, AnotherUsersServiceGetsNothing) {
    OtherUser other;
    if (!other.IsOther())
        GTEST_SKIP() << "only root may become another user";
    EXPECT_EQ(m_reporter.SetUser("u1"), Result::OtherUsersService);
    EXPECT_EQ(m_reporter.Event("B1"), Result::OtherUsersService);
    EXPECT_EQ(m_reporter.Event("A100|1"), Result::OtherUsersService);
    EXPECT_THAT(other.Port().Take(), IsEmpty());
}

TEST_F(ServiceComesAndGoes, AnotherUsersServiceGetsTheEventsOfAReporterThatAllowsIt) {
    OtherUser other;
    if (!other.IsOther())
        GTEST_SKIP() << "only root may become another user";
    hublink::Options options;
    options.allowOtherUsersService = true;
    hublink::Reporter reporter({}, options);
    EXPECT_EQ(reporter.Event("B1"), Result::Sent);
    EXPECT_THAT(other.Port().Take(), ElementsAre(EventWithId("B1")));
}

TEST_F(ServiceComesAndGoes, TheOwnServiceBehindAnotherUsersGetsTheNextEvent) {
    {
        OtherUser other;
        if (!other.IsOther())
            GTEST_SKIP() << "only root may become another user";
        EXPECT_EQ(m_reporter.SetUser("u1"), Result::OtherUsersService);
    }
    m_port.emplace();
    EXPECT_EQ(m_reporter.Event("B1"), Result::Sent);
    EXPECT_THAT(m_port->Take(), ElementsAre(USER, EventWithId("B1")));
}

TEST_F(ServiceComesAndGoes, AnotherUsersServiceGetsNothingFromAProgramWithoutAFreeDescriptor) {
    EXPECT_EQ(m_reporter.Event("B1"), Result::NobodyListens);
    OtherUser other;
    if (!other.IsOther())
        GTEST_SKIP() << "only root may become another user";
    {
        const NoFreeDescriptor none;
        EXPECT_EQ(m_reporter.Event("B2"), Result::SystemError);
        EXPECT_EQ(m_reporter.SetUser("u1"), Result::SystemError);
    }
    EXPECT_EQ(m_reporter.Event("B3"), Result::OtherUsersService);
    {
        const NoFreeDescriptor none;
        EXPECT_EQ(m_reporter.Event("B4"), Result::OtherUsersService);
    }
    EXPECT_THAT(other.Port().Take(), IsEmpty());
}

TEST_F(ServiceComesAndGoes, TheOwnServiceGetsTheEventsOfAProgramWithoutAFreeDescriptor) {
    m_port.emplace();
    EXPECT_EQ(m_reporter.Event("A100|1"), Result::Sent);
    {
        const NoFreeDescriptor none;
        AdvanceSteadyClock(std::chrono::seconds(1));
        EXPECT_EQ(m_reporter.Event("A100|2"), Result::Sent);
    }
    EXPECT_THAT(m_port->Take(), ElementsAre(INIT, EventWithId("A100|1"), EventWithId("A100|2")));
}

TEST_F(ServiceComesAndGoes, ARefusalThatComesLateCostsNoEventAndTellsEverythingAgain) {
    m_port.emplace();
    EXPECT_EQ(m_reporter.SetUser("u1"), Result::Sent);
    EXPECT_EQ(m_reporter.Event("A100|1"), Result::Sent);
    m_port->Take();
    // The system does this when it learns of a refusal only after the earlier send.
    FailNextSend(ECONNREFUSED);
    EXPECT_EQ(m_reporter.Event("A100|2"), Result::Sent);
    EXPECT_THAT(m_port->Take(), ElementsAre(USER, INIT, EventWithId("A100|2")));
}

TEST_F(ServiceComesAndGoes, ARefusalThatIsNeverToldIsSeenByWhoListens) {
    SwallowRefusals();
    EXPECT_EQ(m_reporter.Event("B1"), Result::NobodyListens);
    m_port.emplace();
    EXPECT_EQ(m_reporter.Event("A100|1"), Result::Sent);
    m_port.reset();
    EXPECT_TRUE(WaitUntil([this] { return m_reporter.Event("B1") == Result::NobodyListens; },
                          std::chrono::seconds(5)));
    EXPECT_EQ(m_reporter.Event("A100|1"), Result::NobodyListens);
    m_port.emplace();
    EXPECT_EQ(m_reporter.Event("A100|2"), Result::Sent);
    EXPECT_THAT(m_port->Take(), ElementsAre(INIT, EventWithId("A100|2")));
}

TEST_F(ServiceComesAndGoes, WhatTheSystemAnswersHasItsResult) {
    m_port.emplace();
    const auto resultOf = [this](int error) {
        FailNextSend(error);
        return m_reporter.Event("B1");
    };
    EXPECT_EQ(resultOf(EAGAIN), Result::WouldBlock);
    EXPECT_EQ(resultOf(ENOBUFS), Result::WouldBlock);
    EXPECT_EQ(resultOf(EMSGSIZE), Result::TooLong);
    EXPECT_EQ(resultOf(EPERM), Result::SystemError);
    EXPECT_THAT(m_port->Take(), IsEmpty());
    EXPECT_EQ(resultOf(EINTR), Result::Sent);
    EXPECT_THAT(m_port->Take(), ElementsAre(EventWithId("B1")));
}

TEST_F(ServiceComesAndGoes, AnEventWhoseModuleCouldNotBeAnnouncedIsNotSent) {
    m_port.emplace();
    FailNextSend(EAGAIN);
    EXPECT_EQ(m_reporter.Event("A100|1"), Result::WouldBlock);
    EXPECT_THAT(m_port->Take(), IsEmpty());
    EXPECT_EQ(m_reporter.Event("A100|2"), Result::Sent);
    EXPECT_THAT(m_port->Take(), ElementsAre(INIT, EventWithId("A100|2")));
}

/// Makes the loopback device pass only a thousand bytes a second while this object exists, so that waiting
/// datagrams fill the sender's buffer. It is the loopback of the test's own network. The kernel answers
/// datagrams that are left in it later, and its room for such answers is shared by all networks of the
/// machine.
class SlowNetwork {
public:
    SlowNetwork()
        : m_isSlow(
              std::system("tc qdisc add dev lo root tbf rate 8kbit burst 2000 limit 10000000 2>/dev/null") ==
              0) {}
    ~SlowNetwork() {
        if (m_isSlow) {
            EXPECT_EQ(std::system("tc qdisc del dev lo root"), 0);
        }
    }
    SlowNetwork(const SlowNetwork&) = delete;
    SlowNetwork& operator=(const SlowNetwork&) = delete;

    bool IsSlow() const { return m_isSlow; }

private:
    const bool m_isSlow;
};

TEST_F(ServiceComesAndGoes, AFullSendBufferIsToldAndHoldsNobodyUp) {
    m_port.emplace();
    const SlowNetwork network;
    if (!network.IsSlow())
        GTEST_SKIP() << "the kernel cannot slow its loopback down";
    const std::string text(1000, 'x');
    const auto begin = std::chrono::steady_clock::now();
    constexpr int EVENTS = 1000;
    for (int i = 0; i < EVENTS; ++i)
        m_reporter.Event("B1", text);
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(5))
        << "at its rate, a quarter of an hour";
    EXPECT_GT(m_reporter.Count(Result::WouldBlock), 0U);
    EXPECT_EQ(m_reporter.Count(Result::WouldBlock) + m_reporter.Count(Result::Sent), std::uint64_t{EVENTS});
}
