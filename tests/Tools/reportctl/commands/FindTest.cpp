#include <fstream>

#include <gmock/gmock.h>

#include "tests/Tools/reportctl/support/OutboxFile.h"
#include "tests/Tools/reportctl/support/RowsFixture.h"

namespace {

using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::Not;

/// A log with its store and its outbox, in which texts are spelt in another way than in the datagrams.
class Find : public RowsFixture {
protected:
    void SetUp() override {
        RowsFixture::SetUp();
        MakeOutbox(Database() + "/MetrikOutbox.db");
    }

    void Log(const std::string& datagram) const {
        std::ofstream(Data() + "/hublink/log/metrik/Report.log", std::ios::app)
            << "2026-11-20 10:15:30.123 INFO  [1:2] [App/ReportServer:42 Recv] " << datagram << "\n";
    }

    void Outbox(const std::string& sql) const {
        SQLite::Database(Database() + "/MetrikOutbox.db", SQLite::OPEN_READWRITE).exec(sql);
    }
};

TEST_F(Find, ShowsTheRowsOfADatagramThatSpellsItsTextsDifferently) {
    Log(R"({"eventID":"B1|1","value":{"a" : 1},"createTime":1700000000})");
    Log(R"({"eventID":"B1|2","value":"say \"hi\"","createTime":1700000000})");
    Log(R"({"eventID":"B1|3","value":"it''s","createTime":1700000000})");
    Insert("'B1|1'", "'{\"a\":1}'", "'1700000000000'");
    Insert("'B1|2'", "'say \"hi\"'", "'1700000000000'");
    Insert("'B1|3'", "'it''s'", "'1700000000000'");
    Insert("'B1|1'", "'{\"a\":1}'", "'1700000001000'"); // of another time
    EXPECT_THAT(OutputOf("find '\"a\" : 1'"), HasSubstr("): 1 found\n  row 1  "));
    EXPECT_THAT(OutputOf("find 'say \\\"hi\\\"'"), HasSubstr("): 1 found\n  row 2  "));
    EXPECT_THAT(OutputOf("find \"it''s\""), HasSubstr("): 1 found\n  row 3  "));
    EXPECT_THAT(OutputOf("find '\"eventID\":\"B1|2\"'"), HasSubstr("): 1 found\n  row 2  "));
    EXPECT_THAT(OutputOf("find B1"), HasSubstr("): 4 found\n  row 1  "));
}

TEST_F(Find, ShowsTheEventsOfADatagramThatSpellsItsTextsDifferently) {
    Log(R"({"eventID":"A100|3","value":{"a" : "x\/y"},"createTime":1700000000})");
    Log(R"({"eventID":"A100|1","value":{"b" : 1},"createTime":1700000000})");
    const std::string payload = R"('{"extend":{"createTime":"1700000000000"},"eventData":{)";
    Outbox("update event set payload = " + payload + R"("a":"x/y","openid":"u"}}')");
    Outbox("update dead_letter set payload = " + payload + R"("b":1}}' where uuid = 'u-1')");
    EXPECT_THAT(OutputOf(R"(find 'x\/y')"), HasSubstr("Outbox: 1 found\n  u-3  "));
    EXPECT_THAT(OutputOf("find '\"b\" : 1'"), HasSubstr("Outbox: 1 found\n  u-1  "));
}

TEST_F(Find, ShowsNoRowOfADatagramThatWasRefused) {
    Log(R"({"eventID":"B1|1","value":{"a" : 1},"createTime":1700000000})");
    std::ofstream(Data() + "/hublink/log/metrik/Report.log", std::ios::app)
        << "2026-11-20 10:15:30.124 ERROR [1:2] [Frame/DBHelper:38 ExecSql] disk is full-insert into OperLog "
           "(eventID,value,createTime,pType,extData3,extData4) values('B1|1', '{\"a\":1}',"
           "'1700000000000',1,'','u')\n";
    Insert("'B1|1'", "'{\"a\":1}'", "'1700000000000'"); // of an equal datagram, before the log begins
    const auto output = OutputOf("find '\"a\" : 1'");
    EXPECT_THAT(output, HasSubstr("-> refused: disk is full"));
    EXPECT_THAT(output, HasSubstr("): 0 found\n"));
}

TEST_F(Find, GivesTheOutcomeOfEachRowAndEventAsJson) {
    Insert("'A100|row'", "'v'", "'1700000000000'");
    Outbox("update event set payload = '{\"a\":1}'");
    const auto output = OutputOf("find A100 --json", "TZ=UTC");
    EXPECT_THAT(output, HasSubstr(R"({"id":1,"at":"2023-11-14T22:13:20.000Z","eventID":"A100|row",)"
                                  R"("value":"v","openid":"u1","createTime":"1700000000000",)"
                                  R"("outcome":"stored","reason":null})"));
    EXPECT_THAT(output, HasSubstr(R"({"id":"u-3","module":"A100","sequence":3,"eventID":"A100|3",)"
                                  R"("state":"waiting","outcome":"toAnalytics","status":null,"reason":null,)"
                                  R"("payload":"{\"a\":1}"})"));
    EXPECT_THAT(output, HasSubstr(R"("state":"dead","outcome":"toAnalytics","status":400,)"
                                  R"("reason":"too odd",)"));
}

} // namespace
