#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "SystemTool/CommonTool.h"
#include "tests/e2e/support/Service.h"
#include "tests/support/WaitUntil.h"

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::StartsWith;

// How each kind of message reaches its end, through the real program alone.

namespace {

constexpr auto TOO_FEW_ARGUMENTS =
    "[BoostLogError]boost::too_few_args: format-string referred to more arguments than were passed";

class ReportPath : public ::testing::Test {
protected:
    ReportPath() {
        m_service.Install();
        m_service.Start();
    }

    /// Module, event id and payload of each event in the outbox, in order.
    std::vector<std::string> Events() const {
        return m_service.Query(m_service.OutboxFile(),
                               "select module_id, event_id, payload from event "
                               "join module on module.id = event.module order by event.id");
    }

    /// The level and message of one site's log lines.
    std::vector<std::string> Messages(const std::string& site) const {
        std::vector<std::string> messages;
        for (const auto& line : m_service.LogLines(site))
            messages.push_back(line.level + " " + line.message);
        return messages;
    }

    static std::string EventJson(const std::string& eventData, const std::string& createTime,
                                 const std::string& openID = "visitor",
                                 const std::string& version = "3.0.0.0") {
        return R"({"extend":{"hublinkVersion":")" + version + R"(","createTime":")" + createTime +
               R"("},"eventData":{)" + eventData + (eventData.empty() ? "" : ",") + R"("openid":")" + openID +
               R"(","sys_version":")" + SystemTool::CommonTool::GetOSVersionString() + R"("}})";
    }

    Service m_service;
};

} // namespace

TEST_F(ReportPath, AReportForTheStoreBecomesARow) {
    Service::Send(R"({"eventID":"B100|10001","value":{"a": 1},"createTime":1700000000,"isDayReport":1})");
    m_service.AwaitQuiet();
    EXPECT_THAT(m_service.Rows(), ElementsAre(R"(B100|10001|{"a":1}|1700000000000|0|3.0.0.0|visitor)"));
    EXPECT_THAT(Events(), IsEmpty());
}

TEST_F(ReportPath, AReportOfTheDefaultModuleBecomesAnEventInTheOutbox) {
    Service::Send(R"({"eventID":"A759|10001","value":{"a": 1},"createTime":1700000000})");
    m_service.AwaitQuiet();
    EXPECT_THAT(Events(), ElementsAre("A759|A759|10001|" + EventJson(R"("a":1)", "1700000000000")));
    EXPECT_THAT(m_service.Rows(), IsEmpty());
}

TEST_F(ReportPath, AnAnnouncedModulesReportsBecomeItsEvents) {
    Service::Send(R"({"eventID":"A100|1"})");
    Service::Send(
        R"({"msgType":"init","exdata":{"moduleID":"A100","moduleVersion":"2","moduleName":"Painter"}})");
    Service::Send(R"({"eventID":"A100|2","createTime":"1700000000123"})");
    m_service.AwaitQuiet();
    EXPECT_THAT(Messages("Metrik/MetrikMgr:115 Send"), ElementsAre("WARN module not init :A100"));
    EXPECT_THAT(Messages("Metrik/MetrikMgr:41 AddWorker"),
                ElementsAre("INFO Add metrik module :A759", "INFO Add metrik module :A100"));
    EXPECT_THAT(Events(), ElementsAre("A100|A100|2|" + EventJson("", "1700000000123")));
}

TEST_F(ReportPath, ANewUserStandsInWhatComesAfter) {
    Service::Send(R"({"eventID":"B1"})");
    Service::Send(R"({"msgType":"updateOpenID","exdata":{"openID":"u1","hublinkVersion":"5.1.0.2"}})");
    Service::Send(R"({"eventID":"B2"})");
    Service::Send(R"({"eventID":"A759|1"})");
    m_service.AwaitQuiet();
    EXPECT_THAT(m_service.Rows("eventID,extData3,extData4"),
                ElementsAre("B1|3.0.0.0|visitor", "B2|5.1.0.2|u1"));
    EXPECT_THAT(Events(), ElementsAre("A759|A759|1|" + EventJson("", "", "u1", "5.1.0.2")));
    EXPECT_THAT(Messages("App/ReportServer:111 SetBaseInfo"), ElementsAre("INFO SetBaseInfo u1-5.1.0.2"));
}

TEST_F(ReportPath, EveryDatagramIsLoggedByTheReceivingThreadAndHandledByAnother) {
    Service::Send(R"({"eventID":"B1"})");
    Service::Send(R"({"msgType":"updateOpenID","exdata":{"openID":"u1"}})");
    m_service.AwaitQuiet();
    const auto received = m_service.LogLines("App/ReportServer:42 Recv");
    ASSERT_EQ(received.size(), 3U); // two of these, and the marker
    EXPECT_EQ(received[0].message, R"({"eventID":"B1"})");
    EXPECT_EQ(received[0].level, "INFO");
    EXPECT_EQ(received[0].process, m_service.Process());
    const auto handled = m_service.LogLines("App/ReportServer:111 SetBaseInfo");
    ASSERT_EQ(handled.size(), 1U);
    EXPECT_NE(handled[0].thread, received[0].thread);
    EXPECT_NE(handled[0].thread, m_service.Process()) << "the main thread only waits";
    EXPECT_NE(received[0].thread, m_service.Process());
}

TEST_F(ReportPath, AReportThatCannotBeParsedIsLoggedAndTheNextOneIsStored) {
    Service::Send(R"({"eventID":)");
    Service::Send(R"({"eventID":"B1"})");
    m_service.AwaitQuiet();
    EXPECT_THAT(Messages("App/ReportServer:123 JsonToStruct"),
                ElementsAre("ERROR Invalid value. At byte 11."));
    EXPECT_THAT(m_service.Rows("eventID"), ElementsAre("B1"));
}

TEST_F(ReportPath, ADatagramOfDirectivesIsLoggedAsUnbuildableAndHandledAllTheSame) {
    Service::Send("%s");
    Service::Send(R"({"eventID":"B1","value":"100%s"})");
    m_service.AwaitQuiet();
    const auto received = Messages("App/ReportServer:42 Recv");
    ASSERT_EQ(received.size(), 3U);
    EXPECT_EQ(received[0], std::string("ERROR ") + TOO_FEW_ARGUMENTS);
    EXPECT_EQ(received[1], std::string("ERROR ") + TOO_FEW_ARGUMENTS);
    EXPECT_THAT(Messages("Metrik/MetrikMgr:53 Update"),
                ElementsAre("ERROR json formate error :Invalid value. At byte 0."));
    EXPECT_THAT(m_service.Rows("value"), ElementsAre("100%s"));
}

TEST_F(ReportPath, AValueWithALoneQuoteIsRejectedWithErrorTextAndStatement) {
    Service::Send(R"({"eventID":"B1","value":"it's"})");
    Service::Send(R"({"eventID":"B2","value":"it''s"})");
    m_service.AwaitQuiet();
    EXPECT_THAT(m_service.Rows("eventID,value"), ElementsAre("B2|it's"));
    std::vector<std::string> rejected;
    for (const auto& line : m_service.LogLines())
        if (line.site.starts_with("Frame/DBHelper:") && line.site.ends_with(" ExecSql"))
            rejected.push_back(line.level + " " + line.message);
    ASSERT_EQ(rejected.size(), 1U);
    EXPECT_TRUE(
        rejected[0].ends_with("-insert into OperLog (eventID,value,createTime,pType,extData3,extData4) "
                              "values('B1', 'it's','',1,'3.0.0.0','visitor')"))
        << rejected[0];
    EXPECT_THAT(rejected[0], StartsWith("ERROR near \"s\": syntax error-"));
}

TEST_F(ReportPath, AnAnalyticsValueThatIsNoJsonIsLoggedAndNotForwarded) {
    Service::Send(R"({"eventID":"A759|1","value":"plain text"})");
    Service::Send(R"({"eventID":"A759","value":{}})");
    m_service.AwaitQuiet();
    EXPECT_THAT(Events(), IsEmpty());
    EXPECT_THAT(Messages("Metrik/MetrikWorker:107 Send"), ElementsAre("ERROR Invalid value. At byte 0."));
    EXPECT_THAT(Messages("Metrik/MetrikMgr:107 Send"), ElementsAre("WARN eventID error :A759"));
}

TEST_F(ReportPath, LettersAndKeysDecideAsTheyAreWritten) {
    Service::Send(R"({"eventID":"a759|1"})");                     // a lower-case letter: to the store
    Service::Send(R"({"eventID":""})");                           // an empty id: to the store
    Service::Send(R"({"other":"eventID"})");                      // "eventID": a report
    Service::Send(R"({"msgType":"Init","exdata":{"openID":1}})"); // an unknown kind: ignored
    Service::Send("");                                            // no bytes: not even logged
    Service::Send(R"({"msgType":"updateOpenID","exdata":{"openID":"eventID"}})"); // "eventID": a report
    m_service.AwaitQuiet();
    EXPECT_THAT(m_service.Rows("eventID,extData4"),
                ElementsAre("a759|1|visitor", "|visitor", "|visitor", "|visitor"));
    EXPECT_THAT(Messages("App/ReportServer:111 SetBaseInfo"), IsEmpty());
    EXPECT_EQ(Messages("App/ReportServer:42 Recv").size(), 6U) << "five of these and the marker";
}

TEST_F(ReportPath, ADatagramIsCutAtAZeroByteAndAt10240Bytes) {
    Service::Send(std::string("{\"eventID\":\"B1\"}\0{\"eventID\":\"B2\"}", 33));
    const std::string head = R"({"eventID":"B3","value":")";
    Service::Send(head + std::string(10240 - head.size() - 2, 'x') + "\"}");
    Service::Send(head + std::string(10241 - head.size() - 2, 'x') + "\"}");
    m_service.AwaitQuiet();
    EXPECT_THAT(m_service.Rows("eventID,length(value)"), ElementsAre("B1|0", "B3|10213"));
    EXPECT_THAT(Messages("App/ReportServer:123 JsonToStruct"),
                ElementsAre("ERROR Missing a comma or '}' after an object member. At byte 10240."));
}

TEST(StoredBaseInformation, StandsInTheRowsFromTheStart) {
    Service service;
    ASSERT_EQ(service.Reportctl({"setup", "--open-id", "u1", "--suite-version", "5.1.0.2"}), 0);
    service.Start();
    Service::Send(R"({"eventID":"B1"})");
    service.AwaitQuiet();
    EXPECT_THAT(service.Rows("extData3,extData4"), ElementsAre("5.1.0.2|u1"));
    EXPECT_EQ(service.LogLines("App/ReportServer:111 SetBaseInfo").front().message, "SetBaseInfo u1-5.1.0.2");
}
