#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "Common/Common.h"
#include "Frame/FrameWorker.h"
#include "Metrik/MetrikMgr.h"
#include "Metrik/MetrikWorker.h"
#include "tests/fakes/FakeLogger.h"

using namespace SyncServiceReport;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

// Beside this program there is a logger and nothing else.

namespace {

LogRecord OnlyRecord() {
    const auto records = FakeLogger().Records();
    EXPECT_EQ(records.size(), 1U);
    return records.empty() ? LogRecord{} : records.front();
}

} // namespace

TEST(WithLoggerOnly, AMissingSqlitePluginIsLoggedWithItsPathAndLaterSendsAreSilent) {
    ReportServer server;
    FrameWorker worker(&server);
    EXPECT_FALSE(worker.Init());
    const LogRecord record = OnlyRecord();
    EXPECT_EQ(record.level, 4);
    EXPECT_EQ(record.file, "Frame/FrameWorker");
    EXPECT_EQ(record.function, "Init");
    EXPECT_EQ(record.message,
              "Failed to load sqlite plugin:" + ORVEK_EXCUTABLE_PATH + "libOrvekSqlite.dylib");
    FakeLogger().Clear();
    EXPECT_FALSE(worker.Send({}));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST(WithLoggerOnly, AMissingSdkIsLoggedWithTheLoadersError) {
    ReportServer server;
    MetrikWorker worker(&server);
    EXPECT_FALSE(worker.InitDefalut());
    const LogRecord record = OnlyRecord();
    EXPECT_EQ(record, (LogRecord{4, "Metrik/MetrikWorker", "InitDefalut", 38, record.message}));
    EXPECT_THAT(record.message, ::testing::StartsWith("Failed to load metrik sdk interface:"));
    EXPECT_THAT(record.message, HasSubstr(ORVEK_EXCUTABLE_PATH + "libMetrikSdk.dylib"));
    EXPECT_THAT(record.message, HasSubstr("No such file or directory"));
    FakeLogger().Clear();
    EXPECT_FALSE(worker.Init({}));
    EXPECT_EQ(OnlyRecord(), (LogRecord{4, "Metrik/MetrikWorker", "Init", 73, record.message}));
    FakeLogger().Clear();
    EXPECT_FALSE(worker.Send({}));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}
