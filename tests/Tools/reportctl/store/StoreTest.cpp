#include "Tools/reportctl/store/Store.h"

#include <optional>

#include "tests/Tools/reportctl/support/RowsFixture.h"

namespace {

/// Opening a store in order to read it, beside a service that has it open.
class OpenToRead : public RowsFixture {
protected:
    std::string Log() const { return Store() + "-wal"; }

    /// Opens the store as the service does. Its log is there from then on, and empty.
    SQLite::Database OpenAsService() const {
        SQLite::Database service(Store(), SQLite::OPEN_READWRITE);
        service.execAndGet("select count(*) from OperLog");
        EXPECT_TRUE(std::filesystem::exists(Log()));
        EXPECT_EQ(std::filesystem::file_size(Log()), 0u);
        return service;
    }
};

TEST_F(OpenToRead, RefusesToWrite) {
    auto reader = reportctl::store::OpenToRead(Store());
    EXPECT_THROW(reader.exec("insert into OperLog (eventID) values ('e')"), SQLite::Exception);
    EXPECT_EQ(reader.execAndGet("select count(*) from OperLog").getInt(), 0);
}

TEST_F(OpenToRead, LeavesTheLogOfAServiceThatEndsBeforeTheReader) {
    std::optional<SQLite::Database> service(OpenAsService());
    {
        const auto reader = reportctl::store::OpenToRead(Store());
        service->exec("insert into OperLog (eventID) values ('e')");
        service.reset();
    }
    ASSERT_TRUE(std::filesystem::exists(Log()));
    EXPECT_GT(std::filesystem::file_size(Log()), 0u);
    EXPECT_EQ(Ask("select eventID from OperLog"), "e");
}

TEST_F(OpenToRead, LeavesNoFileBesideAStoreThatNoProcessUses) {
    ASSERT_FALSE(std::filesystem::exists(Log()));
    {
        auto reader = reportctl::store::OpenToRead(Store());
        reader.execAndGet("select count(*) from OperLog");
    }
    EXPECT_FALSE(std::filesystem::exists(Log()));
    EXPECT_FALSE(std::filesystem::exists(Store() + "-shm"));
}

} // namespace
