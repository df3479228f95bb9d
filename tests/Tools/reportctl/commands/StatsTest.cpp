#include "tests/Tools/reportctl/support/OutboxFile.h"
#include "tests/Tools/reportctl/support/RowsFixture.h"

namespace {

class Stats : public RowsFixture {
protected:
    std::string Json(const std::string& arguments, const std::string& zone = "UTC") const {
        return OutputOf("stats --json " + arguments, "TZ=" + zone);
    }
};

TEST_F(Stats, CountByEventTheMostFrequentFirst) {
    Insert("'B100|2'", "''", "'0'");
    Insert("'B100|1'", "''", "'0'");
    Insert("'B100|2'", "''", "'0'");
    EXPECT_EQ(Json(""), R"([{"key":"B100|2","count":2},{"key":"B100|1","count":1}])"
                        "\n");
    EXPECT_EQ(Json("--by event --top 1"), R"([{"key":"B100|2","count":2}])"
                                          "\n");
}

TEST_F(Stats, CountByModuleAndLastThoseWithout) {
    Insert("'B100|2'", "''", "'0'");
    Insert("'none'", "''", "'0'");
    Insert("'none'", "''", "'0'");
    EXPECT_EQ(Json("--by module"), R"([{"key":"B100","count":1},{"key":null,"count":2}])"
                                   "\n");
}

TEST_F(Stats, CountByHourOfLocalTimeOrOfUtc) {
    Insert("'e'", "''", "'1700000000123'"); // 22:13:20 UTC
    Insert("'e'", "''", "'1700002800000'"); // 23:00 UTC
    Insert("'e'", "''", "'1700002799999'");
    EXPECT_EQ(Json("--by hour --utc"),
              R"([{"key":"2023-11-14T22:00+00:00","count":2},{"key":"2023-11-14T23:00+00:00","count":1}])"
              "\n");
    EXPECT_EQ(Json("--by hour", "UTC-1"),
              R"([{"key":"2023-11-14T23:00+01:00","count":2},{"key":"2023-11-15T00:00+01:00","count":1}])"
              "\n");
    EXPECT_EQ(Json("--by hour", "UTC3:30"),
              R"([{"key":"2023-11-14T18:00-03:30","count":1},{"key":"2023-11-14T19:00-03:30","count":2}])"
              "\n");
}

TEST_F(Stats, KeepTheHoursInOrderWhenSummerTimeEnds) {
    Insert("'e'", "''", "'1761442200000'"); // 01:30 UTC, 02:30 in winter time
    Insert("'e'", "''", "'1761438600000'"); // 00:30 UTC, 02:30 in summer time
    EXPECT_EQ(Json("--by hour", "CET-1CEST,M3.5.0,M10.5.0/3"),
              R"([{"key":"2025-10-26T02:00+02:00","count":1},{"key":"2025-10-26T02:00+01:00","count":1}])"
              "\n");
}

TEST_F(Stats, CountAnEventWithoutATimeInNoHourAndWithinNoBound) {
    MakeOutbox(Database() + "/MetrikOutbox.db"); // no event in it has a time, all were stored at one
    EXPECT_EQ(Json("--since 1970-01-01"), "[]\n");
    EXPECT_EQ(Json("--until 2100-01-01"), "[]\n");
    EXPECT_EQ(Json("--by hour"), R"([{"key":null,"count":3}])"
                                 "\n");
    SQLite::Database(Database() + "/MetrikOutbox.db", SQLite::OPEN_READWRITE)
        .exec(R"(update event set payload = '{"extend":{"createTime":"1700000000123"}}')");
    EXPECT_EQ(Json("--since 1970-01-01 --by hour --utc"), R"([{"key":"2023-11-14T22:00+00:00","count":1}])"
                                                          "\n");
}

TEST_F(Stats, CountByDay) {
    InsertMany(7200); // one each second, until 00:13:19 UTC of the next day
    Insert("'e'", "''", "'-1'");
    Insert("'e'", "''", "'never'");
    EXPECT_EQ(Json("--by day --utc"), R"([{"key":"1969-12-31","count":1},{"key":"2023-11-14","count":6400},)"
                                      R"({"key":"2023-11-15","count":800},{"key":null,"count":1}])"
                                      "\n");
    EXPECT_EQ(Json("--by day --utc --top 1"), R"([{"key":"2023-11-14","count":6400}])"
                                              "\n");
}

TEST_F(Stats, CountWhatTheFilterTakes) {
    InsertMany(9);
    EXPECT_EQ(Json("--event 'B100|0'"), R"([{"key":"B100|0","count":3}])"
                                        "\n");
    EXPECT_EQ(Json("--since 2023-11-14T22:13:27Z"),
              R"([{"key":"B100|1","count":1},{"key":"B100|2","count":1}])"
              "\n");
}

TEST_F(Stats, AreCsvWithAHeader) {
    Insert("'a,b'", "''", "'0'");
    EXPECT_EQ(OutputOf("stats --csv"), "key,count\n\"a,b\",1\n");
    EXPECT_EQ(OutputOf("stats --csv --by module"), "key,count\n,1\n");
}

TEST_F(Stats, AreATableWithBarsAndSayWhatWasCounted) {
    InsertMany(6);
    Insert("'B100|0'", "''", "'0'");
    EXPECT_EQ(OutputOf("stats"),
              "B100|0             3  ##############################\n"
              "B100|1             2  ####################\n"
              "B100|2             2  ####################\n"
              "\n"
              "Counted: 7 rows of the store, 0 events of the outbox (waiting, or dead letters).\n");
}

TEST_F(Stats, SayThatTopIsAWholeNumber) {
    for (const std::string top : {"0", "-1", "x", "1.5", "99999999999999999999"}) {
        const auto outcome = Reportctl("stats --top " + top);
        EXPECT_GE(outcome.exitCode, 100);
        EXPECT_EQ(outcome.output,
                  "--top: \"" + top +
                      "\" is no whole number from 1 on\nRun with --help for more information.\n");
    }
}

TEST_F(Stats, ShowNoEscapeSequenceOfAnEventId) {
    Insert("char(27) || '[2J'", "''", "'0'");
    EXPECT_EQ(OutputOf("stats").substr(0, 7), "\\x1b[2J");
    EXPECT_EQ(Json(""), R"([{"key":"\u001B[2J","count":1}])"
                        "\n");
}

TEST_F(Stats, OfOutcomesTakeNoFilterAndSayThatThereIsNoLedger) {
    EXPECT_GE(Reportctl("stats --by outcome --since 1h").exitCode, 100);
    const auto outcome = Reportctl("stats --by outcome");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says("hublink/run/Report.ledger cannot be read: `reportctl status` says more"))
        << outcome.output;
}

TEST_F(Stats, RefuseAnUnknownGrouping) {
    EXPECT_GE(Reportctl("stats --by week").exitCode, 100);
}

} // namespace
