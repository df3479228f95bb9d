#include <cstdlib>

#include "App/ReportServer.h"
#include "tests/Tools/reportctl/support/SendFixture.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/fakes/FakeSdk.h"
#include "tests/support/WaitUntil.h"

namespace {

/// The service runs in this process, with the real store. Texts that `send` accepts arrive; texts that it
/// refuses do not.
class SendContract : public SendFixture {
protected:
    void SetUp() override {
        ASSERT_EQ(RunSetup().exitCode, 0);
        ::setenv("XDG_DATA_HOME", Data().c_str(), 1);
        ASSERT_TRUE(m_service.Start());
        FakeLogger().Clear();
        FakeSdk().calls.clear();
    }

    void TearDown() override { m_service.Stop(); }

    /// Sends these lines in spite of their errors, and waits until the service has handled them.
    void SendAnyway(const std::string& lines) {
        const auto outcome = Send(FileOf(lines + AN_END) + "--anyway");
        ASSERT_EQ(outcome.exitCode, 0) << outcome.output;
        ++m_ends;
        ASSERT_TRUE(WaitUntil([this] { return Count("eventID = 'the end'") == m_ends; }));
    }

    int Rows() const { return Count("eventID <> 'the end'"); }
    static std::size_t Events() { return FakeSdk().calls.size(); }

private:
    int Count(const std::string& condition) const {
        return std::stoi(Ask("select count(*) from OperLog where " + condition));
    }

    /// The last lines that a test sends. The row of the report shows that everything before it has been
    /// handled, because the store commits the rows of a burst together and in order. A sign-in comes first:
    /// the user before it may have a text with which no row can be stored.
    static constexpr auto AN_END = R"({"msgType":"updateOpenID","exdata":{"openID":"u","hublinkVersion":"1"}}
{"eventID":"the end","createTime":1700000000})";

    int m_ends = 0;
    SyncServiceReport::ReportServer m_service;
};

constexpr auto GOOD_FOR_THE_STORE = R"({"eventID":"B1","createTime":1700000000}
{"eventID":"B'',''","value":"it''s ''''","createTime":1700000000}
{"eventID":"|","value":{"a":"it''s","b":"\u0000"},"createTime":1700000000}
)";

constexpr auto BAD_FOR_THE_STORE = R"({"eventID":"B'","createTime":1700000000}
{"eventID":"B","value":"it's","createTime":1700000000}
{"eventID":"B","value":"it'''s","createTime":1700000000}
{"eventID":"B","value":{"it's":1},"createTime":1700000000}
{"eventID":"B","value":"x\u0000y","createTime":1700000000}
{"eventID":"B","createTime":"yesterday's"}
{"eventID":"B","createTime":1700000000
)";

constexpr auto GOOD_FOR_ANALYTICS = R"({"eventID":"A759|1","createTime":1700000000}
{"eventID":"A759|it's","value":{"a":"it's"},"createTime":1700000000}
{"eventID":"A759|2|3","value":"{\"a\":1}","createTime":1700000000}
{"eventID":"A759|1","value":null,"createTime":1700000000}
{"eventID":"A759|1","value":"null","createTime":1700000000}
)";

constexpr auto BAD_FOR_ANALYTICS = R"({"eventID":"A759","createTime":1700000000}
{"eventID":"A759|1","value":"opened","createTime":1700000000}
{"eventID":"A759|1","value":[1],"createTime":1700000000}
{"eventID":"A759|1","value":5,"createTime":1700000000}
{"eventID":"A759|1","value":true,"createTime":1700000000}
{"eventID":"A759|1","value":"\"x\"","createTime":1700000000}
)";

TEST_F(SendContract, WhatPassesArrives) {
    EXPECT_EQ(Send(FileOf(std::string(GOOD_FOR_THE_STORE) + GOOD_FOR_ANALYTICS) + "--dry-run").exitCode, 0);
    SendAnyway(std::string(GOOD_FOR_THE_STORE) + GOOD_FOR_ANALYTICS);
    EXPECT_EQ(Rows(), 3);
    EXPECT_EQ(Events(), 5u);
}

TEST_F(SendContract, WhatIsRefusedWouldNotArrive) {
    const auto judged = Send(FileOf(std::string(BAD_FOR_THE_STORE) + BAD_FOR_ANALYTICS) + "--dry-run");
    EXPECT_TRUE(judged.Says("would send 0 messages (0 bytes); left out 13 lines")) << judged.output;
    SendAnyway(std::string(BAD_FOR_THE_STORE) + BAD_FOR_ANALYTICS);
    EXPECT_EQ(Rows(), 0);
    EXPECT_EQ(Events(), 0u);
}

TEST_F(SendContract, WhatAReportForgesIsExportedAsAText) {
    SendAnyway(R"({"eventID":"J|1', x'5b5d002c226964223a39392c22782224', '1700000000000', 0, '1','o') -- "})"
               "\n");
    const auto exported = Reportctl("export --format jsonl --event 'J|'");
    EXPECT_TRUE(exported.Says(R"("value":"[]\u0000,\"id\":99,\"x\"$","openid":"o",)")) << exported.output;
}

TEST_F(SendContract, AUserWhoIsRefusedWouldSpoilEveryReport) {
    SendAnyway("{\"msgType\":\"updateOpenID\",\"exdata\":{\"openID\":\"u1\",\"hublinkVersion\":\"5''1\"}}\n" +
               std::string(GOOD_FOR_THE_STORE));
    EXPECT_EQ(Rows(), 3);
    SendAnyway("{\"msgType\":\"updateOpenID\",\"exdata\":{\"openID\":\"u1\",\"hublinkVersion\":\"5'1\"}}\n" +
               std::string(GOOD_FOR_THE_STORE));
    EXPECT_EQ(Rows(), 3);
}

} // namespace
