#include "tests/Tools/reportctl/support/RowsFixture.h"

namespace {

class Backup : public RowsFixture {
protected:
    std::string Directory() const { return Data() + "/backup"; }

    Outcome Run(const std::string& shell = {}) const {
        return Reportctl("backup '" + Directory() + "'", shell);
    }

    static std::string Ask(const std::string& path, const std::string& query) {
        SQLite::Database database(path);
        return database.execAndGet(query).getString();
    }
};

TEST_F(Backup, HasTheRowsThatAreInTheWriteAheadLogAlone) {
    SQLite::Database service(Store(), SQLite::OPEN_READWRITE);
    service.exec("insert into OperLog (eventID) values ('in the log')");
    const auto outcome = Run();
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_EQ(Ask(Directory() + "/Report.db", "select eventID from OperLog"), "in the log");
}

TEST_F(Backup, IsItsOwnersAlone) {
    ASSERT_EQ(Run("umask 0;").exitCode, 0);
    EXPECT_EQ(ModeOf(Directory()), 0700u | static_cast<unsigned>(std::filesystem::perms::none));
    EXPECT_EQ(ModeOf(Directory() + "/Report.db"), 0600u);
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(Directory()), {}), 1);
}

TEST_F(Backup, TakesTheOutboxToo) {
    SQLite::Database(Database() + "/MetrikOutbox.db", SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE)
        .exec("create table event (x); insert into event values ('waits')");
    const auto outcome = Run();
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_EQ(Ask(Directory() + "/MetrikOutbox.db", "select x from event"), "waits");
    EXPECT_EQ(ModeOf(Directory() + "/MetrikOutbox.db"), 0600u);
}

TEST_F(Backup, SaysThatThereIsNoOutbox) {
    EXPECT_TRUE(Run().Says("No outbox: " + Database() + "/MetrikOutbox.db is not there"));
}

TEST_F(Backup, DoesNotTouchADirectoryThatIsThere) {
    std::filesystem::create_directory(Directory());
    std::ofstream(Directory() + "/mine") << "mine";
    const auto outcome = Run();
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says("cannot make the directory " + Directory() + ": File exists")) << outcome.output;
    EXPECT_EQ(ContentOf(Directory() + "/mine"), "mine");
}

TEST_F(Backup, OfADamagedStoreFailsAndLeavesNothing) {
    InsertMany(2000);
    std::fstream(Store(), std::ios::in | std::ios::out | std::ios::binary).seekp(8192)
        << std::string(4096, 'x');
    const auto outcome = Run();
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says("error: " + Store() + " is damaged: ")) << outcome.output;
    EXPECT_FALSE(std::filesystem::exists(Directory()));
}

TEST_F(Backup, SaysThatTheStoreIsMissing) {
    std::filesystem::remove_all(Database());
    const auto outcome = Run();
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says(Store() + " is missing")) << outcome.output;
    EXPECT_FALSE(std::filesystem::exists(Directory()));
}

} // namespace
