#include <fstream>

#include <sys/mount.h>

#include "tests/Modules/OrvekSqlite/SqliteFixture.h"
#include "tests/support/WaitUntil.h"

// A really full disk: a small file system of the test without any room left.
namespace {

class FullDisk : public SqliteFixture {
protected:
    void SetUp() override {
        SqliteFixture::SetUp();
        ASSERT_EQ(::mount("full", Directory().c_str(), "tmpfs", 0, "mode=700,size=1m"), 0);
        MakeStore(Store());
        ASSERT_TRUE(Plugin()->Open(Store())) << Plugin()->GetLastErrorMsg();
    }

    void TearDown() override { ::umount2(Directory().c_str(), MNT_DETACH); }

    bool Exec(const std::string& sql) { return Plugin()->ExecSql(sql); }

    /// Makes a file that takes all the room except `free` bytes.
    std::string FillUpTo(std::uintmax_t free) const {
        const auto filler = Directory() + "/filler";
        std::ofstream(filler) << std::string(std::filesystem::space(Directory()).available - free, 'x');
        return filler;
    }
};

TEST_F(FullDisk, CostsNoStatementThatWasAccepted) {
    const auto filler = FillUpTo(100'000);
    std::string accepted;
    int next = 0;
    ASSERT_TRUE(WaitUntil([&] {
        for (int i = 0; i < 100; ++i, ++next) {
            if (!Exec(Insert(std::to_string(next))))
                return true;
            accepted += std::to_string(next) + ",";
        }
        return false;
    }));
    EXPECT_EQ(Plugin()->GetLastErrorMsg(), "database or disk is full");
    for (int i = 0; i < 1000; ++i)
        EXPECT_FALSE(Exec(Insert("refused")));

    std::filesystem::remove(filler);
    // The plug-in does this by itself: no further statement comes.
    const auto all = "select group_concat(eventID || ',', '') from (select eventID from OperLog order by id)";
    EXPECT_TRUE(WaitUntil([&] { return Ask(Store(), all) == accepted; })) << Ask(Store(), all);
    EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
    EXPECT_TRUE(Exec(Insert("next"))) << Plugin()->GetLastErrorMsg();
}

} // namespace
