#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "Common/Common.h"
#include "Frame/FrameWorker.h"
#include "Metrik/MetrikMgr.h"
#include "tests/fakes/FakeLogger.h"

using namespace SyncServiceReport;
using ::testing::ElementsAre;

// Beside this program there are a SQLite plug-in without "CreateModule", and an SDK whose start throws an
// exception of a class that only its own library has.

TEST(WithBrokenPlugins, AStoreWithoutCreateModuleIsLoggedAsOneThatCannotBeLoaded) {
    ReportServer server;
    FrameWorker worker(&server);
    EXPECT_FALSE(worker.Init());
    const auto records = FakeLogger().RecordsOf("Init");
    ASSERT_EQ(records.size(), 1U);
    EXPECT_EQ(records[0].message,
              "Failed to load sqlite plugin:" + ORVEK_EXCUTABLE_PATH + "libOrvekSqlite.dylib");
    EXPECT_FALSE(worker.Send({}));
}

TEST(WithBrokenPlugins, AnExceptionOfTheSdksOwnClassIsLoggedThoughItsWorkerIsGone) {
    ReportServer server;
    MetrikMgr mgr(&server);
    EXPECT_FALSE(mgr.Update(R"({"msgType":"init","exdata":{"moduleID":"A100"}})"));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(LogRecord{3, "Metrik/MetrikMgr", "Update", 93,
                                                              "Std exception :the SDK's own error "}));
}
