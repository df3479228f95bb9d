#include <chrono>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <hublink/report.h>
#include <hublink/report.hpp>

#include "tests/Client/ScriptedClock.h"
#include "tests/Client/ServicePort.h"

using hublink::Result;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

// The service may not have got an announcement that was sent, and it forgets everything when it is restarted.

namespace {

constexpr std::chrono::seconds LOOK_INTERVAL{1};
constexpr std::chrono::minutes TELL_INTERVAL{3};

const auto INIT = HasSubstr("\"msgType\":\"init\"");
const auto EVENT = HasSubstr("\"eventID\":\"A100|1\"");

auto User(const std::string& openId, const std::string& version) {
    return HasSubstr("{\"openID\":\"" + openId + "\",\"hublinkVersion\":\"" + version + "\"}");
}

class ClientAnnouncement : public ::testing::Test {
protected:
    std::vector<std::string> DatagramsOfAnEvent() {
        EXPECT_EQ(m_reporter.Event("A100|1"), Result::Sent);
        return m_port.Take();
    }

    ServicePort m_port;
    hublink::Reporter m_reporter{hublink::Module{"A100", "2.1", "Painter"}};
};

} // namespace

TEST_F(ClientAnnouncement, IsRepeatedWithinASecondAfterTheListenersFullBufferLostIt) {
    m_port.Fill();
    EXPECT_EQ(m_reporter.SetUser("u1", "5.1"), Result::Sent);
    EXPECT_EQ(m_reporter.Event("A100|1"), Result::Sent);
    m_port.Take(); // what filled the buffer
    EXPECT_THAT(DatagramsOfAnEvent(), ElementsAre(EVENT)) << "the loss is not seen yet";
    AdvanceSteadyClock(LOOK_INTERVAL);
    EXPECT_THAT(DatagramsOfAnEvent(), ElementsAre(User("u1", "5.1"), INIT, EVENT));
    AdvanceSteadyClock(LOOK_INTERVAL);
    EXPECT_THAT(DatagramsOfAnEvent(), ElementsAre(EVENT)) << "nothing was lost since";
}

TEST_F(ClientAnnouncement, IsRepeatedEveryThreeMinutesInAnyCase) {
    EXPECT_EQ(m_reporter.SetUser("u1", "5.1"), Result::Sent);
    EXPECT_THAT(DatagramsOfAnEvent(), ElementsAre(User("u1", "5.1"), INIT, EVENT));
    AdvanceSteadyClock(TELL_INTERVAL - std::chrono::seconds(30));
    EXPECT_THAT(DatagramsOfAnEvent(), ElementsAre(EVENT));
    for (int i = 0; i < 2; ++i) {
        AdvanceSteadyClock(TELL_INTERVAL);
        EXPECT_THAT(DatagramsOfAnEvent(), ElementsAre(User("u1", "5.1"), INIT, EVENT));
    }
}

TEST_F(ClientAnnouncement, OfAUserIsRepeatedWithTheLastVersionThatWasNotEmpty) {
    EXPECT_EQ(m_reporter.SetUser("u1", "5.1"), Result::Sent);
    EXPECT_EQ(m_reporter.SetUser("u2"), Result::Sent);
    EXPECT_EQ(m_reporter.Event("B1"), Result::Sent);
    EXPECT_THAT(m_port.Take(), ElementsAre(User("u1", "5.1"), User("u2", ""), HasSubstr("B1")));
    AdvanceSteadyClock(TELL_INTERVAL);
    EXPECT_EQ(m_reporter.Event("B2"), Result::Sent);
    EXPECT_THAT(m_port.Take(), ElementsAre(User("u2", "5.1"), HasSubstr("B2")));
}

TEST_F(ClientAnnouncement, OfAUserHasTheVersionThatCouldNotBeToldBefore) {
    m_port.Fill();
    EXPECT_EQ(m_reporter.SetUser("u1", "5.1"), Result::Sent);
    m_port.Take();
    AdvanceSteadyClock(LOOK_INTERVAL);
    EXPECT_EQ(m_reporter.SetUser("u2"), Result::Sent);
    EXPECT_THAT(m_port.Take(), ElementsAre(User("u2", "5.1")));
}

TEST_F(ClientAnnouncement, OfAUserGoesWithoutTheVersionWhenBothTogetherAreTooLong) {
    EXPECT_EQ(m_reporter.SetUser("u1", std::string(5000, '5')), Result::Sent);
    const std::string longId(6000, 'u');
    EXPECT_EQ(m_reporter.SetUser(longId), Result::Sent);
    m_port.Take();
    AdvanceSteadyClock(TELL_INTERVAL);
    EXPECT_EQ(m_reporter.Event("B1"), Result::Sent);
    EXPECT_THAT(m_port.Take(), ElementsAre(User(longId, ""), HasSubstr("B1")));
}

TEST_F(ClientAnnouncement, OfAUserIsRepeatedWithTheVersionInC) {
    hublink_reporter* const reporter = hublink_reporter_new(nullptr, nullptr, nullptr);
    EXPECT_EQ(hublink_reporter_set_user(reporter, "u1", "5.1"), HUBLINK_SENT);
    EXPECT_EQ(hublink_reporter_set_user(reporter, "u2", nullptr), HUBLINK_SENT);
    EXPECT_THAT(m_port.Take(), ElementsAre(User("u1", "5.1"), User("u2", "")));
    AdvanceSteadyClock(TELL_INTERVAL);
    EXPECT_EQ(hublink_reporter_event(reporter, "B1", nullptr), HUBLINK_SENT);
    EXPECT_THAT(m_port.Take(), ElementsAre(User("u2", "5.1"), HasSubstr("B1")));
    hublink_reporter_free(reporter);
}
