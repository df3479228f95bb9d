#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "Common/Common.h"
#include "Frame/FrameWorker.h"
#include "Metrik/MetrikMgr.h"
#include "Metrik/MetrikWorker.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/support/MountedOver.h"

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

TEST(WithBrokenPlugins, AnSdkWithoutCreateModuleIsLoggedWithTheLoadersError) {
    const std::string library = ORVEK_EXCUTABLE_PATH + "libMetrikSdk.dylib";
    const MountedOver withoutCreate(ORVEK_EXCUTABLE_PATH + "libOrvekSqlite.dylib", library);
    const std::string message = "Failed to load metrik sdk interface:No CreateModule func export,please "
                                "check your dll export regular:" +
                                library;
    FakeLogger().Clear();
    ReportServer server;
    MetrikWorker worker(&server);
    EXPECT_FALSE(worker.InitDefalut());
    EXPECT_FALSE(worker.Init({}));
    EXPECT_FALSE(worker.Send({}));
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(LogRecord{4, "Metrik/MetrikWorker", "InitDefalut", 38, message},
                            LogRecord{4, "Metrik/MetrikWorker", "Init", 73, message}));
}

TEST(WithBrokenPlugins, AnExceptionOfTheSdksOwnClassIsLoggedThoughItsWorkerIsGone) {
    ReportServer server;
    MetrikMgr mgr(&server);
    EXPECT_FALSE(mgr.Update(R"({"msgType":"init","exdata":{"moduleID":"A100"}})"));
    EXPECT_THAT(FakeLogger().Records(), ElementsAre(LogRecord{3, "Metrik/MetrikMgr", "Update", 93,
                                                              "Std exception :the SDK's own error "}));
}
