#include <algorithm>

#include <unistd.h>

#include "tests/Tools/reportctl/support/RowsFixture.h"

namespace {

class Export : public RowsFixture {
protected:
    std::string File() const { return Data() + "/out"; }
};

constexpr auto HEADER = "id,at,event,module,action,value,openid,suite_version,create_time\n";

TEST_F(Export, WritesCsvWithAHeaderInTheOrderOfTheIds) {
    Insert("'B100|10001'", "'hello'", "'1700000000123'");
    Insert("'none'", "NULL", "'soon'");
    EXPECT_EQ(OutputOf("export --format csv"),
              HEADER + std::string(
                           "1,2023-11-14T22:13:20.123Z,B100|10001,B100,10001,hello,u1,5.1.0.2,1700000000123\n"
                           "2,,none,,,,u1,5.1.0.2,soon\n"));
}

TEST_F(Export, WritesJsonLines) {
    Insert("'B100|1'", "'{\"page\":\"start\"}'", "'1700000000123'");
    EXPECT_EQ(OutputOf("export --format jsonl"),
              "{\"id\":1,\"at\":\"2023-11-14T22:13:20.123Z\",\"event\":\"B100|1\",\"module\":\"B100\","
              "\"action\":\"1\","
              "\"value\":{\"page\":\"start\"},\"openid\":\"u1\",\"suite_version\":\"5.1.0.2\","
              "\"create_time\":\"1700000000123\"}\n");
}

TEST_F(Export, WritesAValueWithAZeroByteAsAText) {
    Insert("'J|1'", "x'5b5d002c226964223a39392c22782224'", "'0'"); // []<NUL>,"id":99,"x"$
    Insert("'J|2'", "'[1]' || char(0) || 'garbage'", "'0'");
    const auto lines = OutputOf("export --format jsonl");
    EXPECT_NE(lines.find(R"("value":"[]\u0000,\"id\":99,\"x\"$",)"), std::string::npos) << lines;
    EXPECT_NE(lines.find(R"("value":"[1]\u0000garbage",)"), std::string::npos) << lines;
    EXPECT_EQ(lines.find('\0'), std::string::npos);
}

TEST_F(Export, TakesRowsFromTheFirstBoundOnAndBeforeTheSecond) {
    InsertMany(10);
    EXPECT_EQ(OutputOf("export --since 2023-11-14T22:13:22Z --until 2023-11-14T22:13:24Z | cut -d, -f1"),
              "id\n3\n4\n");
}

TEST_F(Export, LeavesOutRowsWithoutATimeOnceABoundIsGiven) {
    Insert("'e'", "'v'", "'yesterday'");
    EXPECT_EQ(OutputOf("export --since 1970-01-01"), HEADER);
    EXPECT_EQ(OutputOf("export --until 2100-01-01"), HEADER);
}

TEST_F(Export, TakesAnEventByItsBeginning) {
    Insert("'B100|1'", "'a'", "'0'");
    Insert("'B1%'", "'b'", "'0'");
    Insert("'b100|1'", "'c'", "'0'");
    EXPECT_EQ(OutputOf("export --event 'B100|' | cut -d, -f1"), "id\n1\n");
    EXPECT_EQ(OutputOf("export --event 'B1%' | cut -d, -f1"), "id\n2\n");
}

TEST_F(Export, GoesOnAfterAnId) {
    InsertMany(5);
    EXPECT_EQ(OutputOf("export --after-id 3 | cut -d, -f1"), "id\n4\n5\n");
    EXPECT_EQ(OutputOf("export --after-id 5"), HEADER);
    EXPECT_EQ(OutputOf("export --after-id 9223372036854775807"), HEADER);
    EXPECT_EQ(OutputOf("export --after-id -1 | wc -l"), "6\n");
}

TEST_F(Export, OfAnEmptyStoreIsAHeader) {
    EXPECT_EQ(OutputOf("export"), HEADER);
    EXPECT_EQ(OutputOf("export --format jsonl"), "");
}

TEST_F(Export, TakesTheRowsThatAreInTheWriteAheadLogAlone) {
    SQLite::Database service(Store(), SQLite::OPEN_READWRITE);
    service.exec("insert into OperLog (eventID) values ('in the log')");
    ASSERT_GT(std::filesystem::file_size(Store() + "-wal"), 0u);
    EXPECT_NE(OutputOf("export").find("in the log"), std::string::npos);
}

TEST_F(Export, WorksOnAStoreOfAnOlderSetUp) {
    Sql("drop view reports; pragma user_version = 1");
    Insert("'B100|1'", "'v'", "'0'");
    EXPECT_EQ(OutputOf("export | wc -l"), "2\n");
}

TEST_F(Export, WritesAFileThatIsItsOwnersAlone) {
    InsertMany(3);
    const auto outcome = Reportctl("export --output '" + File() + "'");
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_EQ(outcome.output, "3 rows written to " + File() + "\n");
    EXPECT_EQ(ModeOf(File()), 0600u);
    const auto content = ContentOf(File());
    EXPECT_EQ(std::count(content.begin(), content.end(), '\n'), 4);
}

TEST_F(Export, LeavesTheOldFileWhenTheStoreCannotBeRead) {
    std::ofstream(File()) << "old";
    std::ofstream(Store(), std::ios::trunc)
        << "no database, but long enough to be looked at as one: " << std::string(4096, 'x');
    const auto outcome = Reportctl("export --output '" + File() + "'");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says("error: " + Store() + ": file is not a database")) << outcome.output;
    EXPECT_EQ(ContentOf(File()), "old");
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(Data()), {}), 2); // hublink and the file
}

TEST_F(Export, SaysThatTheStoreIsMissing) {
    std::filesystem::remove_all(Database());
    const auto outcome = Reportctl("export");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says("error: " + Store() + " is missing. `reportctl setup` makes it."))
        << outcome.output;
}

TEST_F(Export, LeavesNoFileOfAnAdministratorWhoReads) {
    if (::geteuid() != 0)
        GTEST_SKIP() << "only root can be another user";
    InsertMany(3);
    constexpr uid_t OWNER = 12345;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(Data()))
        ASSERT_EQ(::chown(entry.path().c_str(), OWNER, OWNER), 0);
    const auto before = Everything();
    EXPECT_EQ(Reportctl("export").exitCode, 0);
    EXPECT_EQ(Reportctl("stats").exitCode, 0);
    EXPECT_EQ(Everything(), before);
}

TEST_F(Export, SaysThatTheOutputIsFull) {
    InsertMany(3);
    const auto outcome = Reportctl("export > /dev/full; }", "{");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_EQ(outcome.output, "error: cannot write to standard output: No space left on device\n");
    EXPECT_EQ(Reportctl("export --output /dev/full").exitCode, 1);
    EXPECT_TRUE(std::filesystem::is_character_file("/dev/full"));
}

TEST_F(Export, EndsQuietlyWhenItsReaderDoes) {
    InsertMany(20'000);
    EXPECT_EQ(Reportctl("export; } | head -n 1", "{ exec 2>'" + Errors() + "';").output, HEADER);
    EXPECT_EQ(ContentOf(Errors()), "");
}

TEST_F(Export, RefusesATimeThatIsNone) {
    const auto outcome = Reportctl("export --since yesterday");
    EXPECT_GE(outcome.exitCode, 100);
    EXPECT_TRUE(outcome.Says("\"yesterday\" is no time: write 10m, 2h or 90d back from now"))
        << outcome.output;
}

} // namespace
