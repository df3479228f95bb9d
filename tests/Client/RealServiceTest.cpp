#include <chrono>
#include <cstdlib>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <hublink/report.hpp>

#include "tests/e2e/support/Service.h"
#include "tests/support/WaitUntil.h"

using hublink::Json;
using hublink::Result;
using ::testing::AllOf;
using ::testing::Contains;
using ::testing::ElementsAre;

// The library with the real service, as on a user's machine.

namespace {

class ClientOfTheService : public ::testing::Test {
protected:
    ClientOfTheService() { m_service.Install(); }

    std::vector<std::string> Events() const {
        return m_service.Query(m_service.OutboxFile(), "select event_id from event order by id");
    }

    Service m_service;
    hublink::Reporter m_reporter{hublink::Module{"A100", "2.1", "Painter"}};
};

} // namespace

TEST_F(ClientOfTheService, TimeUserVersionAndModuleArrive) {
    m_service.Start();
    const hublink::Reporter::Time time(std::chrono::milliseconds(1234567890));
    ASSERT_EQ(m_reporter.SetUser("u\"eventID\"", "5.1.0.2"), Result::Sent);
    ASSERT_EQ(m_reporter.Event("B'1", Json{R"({"it's":"\u0027"})"}, time), Result::Sent);
    ASSERT_EQ(m_reporter.Event("A100|1", {}, time), Result::Sent);
    m_service.AwaitQuiet();
    EXPECT_THAT(m_service.Rows(), ElementsAre(R"(B'1|{"it's":"'"}|01234567890|1|5.1.0.2|u"eventID")"))
        << "no seconds";
    EXPECT_THAT(m_service.Query(m_service.OutboxFile(),
                                "select module_id, version, name from module join module_release "
                                "on module_release.module = module.id where module_id = 'A100'"),
                ElementsAre("A100|2.1|Painter"));
}

TEST_F(ClientOfTheService, AStoppedServiceIsToldAndAStartedOneGetsTheNextEvent) {
    EXPECT_EQ(m_reporter.SetUser("u1", "5"), Result::NobodyListens);
    EXPECT_EQ(m_reporter.Event("A100|1"), Result::NobodyListens);
    m_service.Start();
    EXPECT_EQ(m_reporter.Event("A100|2"), Result::Sent);
    m_service.AwaitQuiet();
    m_service.Kill();
    EXPECT_EQ(m_reporter.Event("A100|3"), Result::NobodyListens);
    m_service.Start();
    EXPECT_EQ(m_reporter.Event("A100|4"), Result::Sent);
    EXPECT_EQ(m_reporter.Event("B5"), Result::Sent);
    m_service.AwaitQuiet();
    EXPECT_THAT(Events(), ElementsAre("A100|2", "A100|4"));
    EXPECT_THAT(m_service.Rows("eventID,extData3,extData4"), ElementsAre("B5|5|u1"));
}

TEST_F(ClientOfTheService, AnUnnoticedRestartCostsNoMoreThanTheEventsOfAFewSeconds) {
    m_service.Start();
    ASSERT_EQ(m_reporter.Event("A100|1"), Result::Sent);
    m_service.AwaitQuiet();
    m_service.Kill();
    m_service.Start();
    EXPECT_TRUE(WaitUntil(
        [this] {
            EXPECT_EQ(m_reporter.Event("A100|2"), Result::Sent);
            return !m_service.Query(m_service.OutboxFile(), "select 1 from event where event_id = 'A100|2'")
                        .empty();
        },
        std::chrono::seconds(5)));
}

TEST_F(ClientOfTheService, TheExamplesReport) {
    m_service.Start();
    for (const auto* example : {"hublink_first_report", "hublink_many_threads", "hublink_in_c"})
        EXPECT_EQ(std::system((std::string(SSR_CLIENT_EXAMPLES "/") + example + " >/dev/null").c_str()), 0)
            << example;
    m_service.AwaitQuiet();
    EXPECT_THAT(m_service.Query(m_service.DatabaseFile(),
                                "select eventID, count(*) from OperLog group by 1 order by 1"),
                ElementsAre("B100|10001|1", "B100|10002|100", "B100|10003|1"));
    EXPECT_THAT(m_service.Rows("value"), AllOf(Contains("it's stored as it is, 100 %"),
                                               Contains("a 'quoted' text"), Contains("thread 3, step 24")));
    EXPECT_THAT(Events(), ElementsAre("A100|10001", "A100|10003"));
}
