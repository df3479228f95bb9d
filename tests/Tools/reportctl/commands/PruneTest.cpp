#include "tests/Tools/reportctl/support/RowsFixture.h"

namespace {

class Prune : public RowsFixture {
protected:
    std::string Rows() const { return Ask("select count(*) from OperLog"); }
    std::uintmax_t Bytes() const { return std::filesystem::file_size(Store()); }
};

constexpr auto NEWEST_FOUR = "prune --older-than 2023-11-14T22:13:26Z"; // keeps the newest four of ten rows

TEST_F(Prune, DeletesNothingWithoutYes) {
    InsertMany(10);
    const auto outcome = Reportctl(NEWEST_FOUR);
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_EQ(outcome.output, "Would delete 6 of 10 rows of " + Store() +
                                  ".\nNothing was deleted. To delete them, give --yes.\n");
    EXPECT_EQ(Rows(), "10");
}

TEST_F(Prune, DeletesByAge) {
    InsertMany(10);
    const auto outcome = Reportctl(std::string(NEWEST_FOUR) + " --yes");
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_TRUE(outcome.Says("Deleted 6 of 10 rows. ")) << outcome.output;
    EXPECT_EQ(Ask("select min(id) || ' ' || count(*) from OperLog"), "7 4");
}

TEST_F(Prune, ByAgeFindsOldRowsBetweenNewOnesAndLeavesThoseWithoutATime) {
    InsertMany(10);
    Insert("'late'", "''", "'1'");
    Insert("'no time'", "''", "'soon'");
    Insert("'no time'", "''", "NULL");
    EXPECT_EQ(Reportctl("prune --older-than 2000-01-01 --yes").exitCode, 0);
    EXPECT_EQ(Rows(), "12");
    EXPECT_EQ(Ask("select count(*) from OperLog where eventID = 'late'"), "0");
}

TEST_F(Prune, KeepsTheNewestRows) {
    InsertMany(10);
    Sql("delete from OperLog where id in (9, 5)");
    EXPECT_EQ(Reportctl("prune --keep-rows 3 --yes").exitCode, 0);
    EXPECT_EQ(Ask("select group_concat(id) from OperLog"), "7,8,10");
    EXPECT_EQ(Reportctl("prune --keep-rows 3 --yes").output.rfind("Deleted 0 of 3 rows.", 0), 0u);
    EXPECT_EQ(Reportctl("prune --keep-rows 0 --yes").exitCode, 0);
    EXPECT_EQ(Rows(), "0");
}

TEST_F(Prune, KeepsWhatFitsAndGivesTheSpaceBack) {
    InsertMany(100'000);
    const auto before = Bytes();
    ASSERT_GT(before, 5u << 20);
    const auto outcome = Reportctl("prune --keep-mib 2 --yes");
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_LE(Bytes(), 2u << 20);
    EXPECT_GT(Bytes(), (2u << 20) - (1u << 19));
    EXPECT_EQ(Ask("select max(id) from OperLog"), "100000");
    EXPECT_EQ(Ask("pragma integrity_check"), "ok");
}

TEST_F(Prune, SaysHowAStoreOfAnOlderSetUpCanShrink) {
    Sql("pragma auto_vacuum = none; vacuum");
    InsertMany(20'000);
    const auto before = Bytes();
    const auto outcome = Reportctl("prune --keep-rows 10 --yes");
    EXPECT_TRUE(outcome.Says("stop the service and run `reportctl setup --compact` once")) << outcome.output;
    EXPECT_EQ(Bytes(), before);
    ASSERT_EQ(RunSetup().exitCode, 0); // set-up rewrites a small store without being asked
    EXPECT_LT(Bytes(), before / 10);
    EXPECT_EQ(Ask("pragma auto_vacuum"), "2");
    EXPECT_EQ(Rows(), "10");
}

TEST_F(Prune, WantsOneRule) {
    EXPECT_GE(Reportctl("prune").exitCode, 100);
    EXPECT_GE(Reportctl("prune --keep-rows 1 --keep-mib 1").exitCode, 100);
    EXPECT_GE(Reportctl("prune --keep-rows -1").exitCode, 100);
    EXPECT_GE(Reportctl("prune --older-than tomorrow").exitCode, 100);
}

TEST_F(Prune, SaysThatAnotherProgramHoldsTheLock) {
    InsertMany(10);
    SQLite::Database other(Store(), SQLite::OPEN_READWRITE);
    other.exec("begin immediate");
    const auto outcome = Reportctl("prune --keep-rows 1 --yes");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says("error: " + Store() + ": database is locked")) << outcome.output;
}

} // namespace
