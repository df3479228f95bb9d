#include <csignal>
#include <filesystem>

#include <gtest/gtest.h>
#include <unistd.h>

#include "App/MiniDump.h"
#include "App/ReportServer.h"
#include "Common/Common.h"
#include "Frame/DBHelper.h"
#include "Frame/FrameWorker.h"
#include "Metrik/MetrikMgr.h"
#include "Metrik/MetrikWorker.h"

using namespace SyncServiceReport;
using ::testing::ExitedWithCode;

// Beside this program there is no plug-in: no logger, no database, no SDK.

namespace {

ST_OptLog Log(const std::string& eventID) {
    ST_OptLog log;
    log.eventID = eventID;
    return log;
}

/// Runs `body` with standard output sent to standard error, which a death test examines.
template <typename Body>
void Quietly(Body body) {
    ::dup2(STDERR_FILENO, STDOUT_FILENO);
    body();
}

} // namespace

TEST(WithoutPlugins, LoggingIsSilent) {
    EXPECT_EQ(pSysLog, nullptr);
    WriteLog({LogLevel::Error, "Function"}, "%s");
    EXPECT_NE(g_LoggerLoader.GetLastError(), "");
}

TEST(WithoutPlugins, TheStoreFails) {
    ReportServer server;
    FrameWorker worker(&server);
    EXPECT_FALSE(worker.Init());
    EXPECT_FALSE(worker.Send(Log("B1")));
    EXPECT_FALSE(DBHelper::instance().ExecSql("select 1"));
}

TEST(WithoutPlugins, AnalyticsWorkersFail) {
    ReportServer server;
    MetrikWorker worker(&server);
    EXPECT_FALSE(worker.InitDefalut());
    EXPECT_FALSE(worker.Init({}));
    EXPECT_FALSE(worker.Send(Log("A759|1")));
}

TEST(WithoutPlugins, ModulesAreRegisteredAllTheSame) {
    ReportServer server;
    MetrikMgr mgr(&server);
    EXPECT_TRUE(mgr.Init());
    EXPECT_TRUE(mgr.Update(R"({"msgType":"init","exdata":{"moduleID":"A1","openID":"u1"}})"));
    EXPECT_EQ(server.GetBaseInfo().openID, "u1");
    EXPECT_FALSE(mgr.Send(Log("A1|1")));
}

TEST(WithoutPlugins, TheServerStartsAndTakesReports) {
    ReportServer server;
    EXPECT_TRUE(server.Start());
    EXPECT_TRUE(server.Recv("%s"));
    server.Stop();
    EXPECT_TRUE(server.Consume(R"({"eventID":"A759|1"})"));
    EXPECT_TRUE(server.Consume(R"({"eventID":"B1"})"));
    EXPECT_FALSE(server.Consume(R"({"eventID")"));
}

TEST(WithoutPluginsDeathTest, ACrashEndsTheProcessWithZeroAndNoOutput) {
    MiniDump::EnableAutoStack("", "Report");
    EXPECT_EXIT(Quietly([] { ::raise(SIGSEGV); }), ExitedWithCode(0), "^$");
}

TEST(WithoutPluginsDeathTest, AMissingPreferencesDirectoryEndsTheProcessWithOneAndNoOutput) {
    std::filesystem::remove_all("/Library/Preferences/hublink"); // a directory of the sandbox
    EXPECT_EXIT(Quietly([] { MiniDump::IsAlreadyRun(); }), ExitedWithCode(1), "^$");
}
