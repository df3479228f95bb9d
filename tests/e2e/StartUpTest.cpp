#include <csignal>
#include <filesystem>
#include <fstream>

#include <Poco/Net/DatagramSocket.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>

#include "tests/e2e/support/Service.h"
#include "tests/support/FileContent.h"
#include "tests/support/ModeOf.h"
#include "tests/support/MountedOver.h"
#include "tests/support/ProcessStatus.h"
#include "tests/support/WaitUntil.h"

using ::testing::ContainsRegex;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

// How the program starts, with everything in its place and without each thing in turn.

namespace {

const std::string REPORT = R"({"eventID":"B1"})";
const std::string EVENT = R"({"eventID":"A759|1"})";

std::vector<std::string> MessagesOf(const std::vector<Service::Line>& lines) {
    std::vector<std::string> messages;
    for (const auto& line : lines)
        messages.push_back(line.message);
    return messages;
}

std::string ContentOfPidFile() {
    return ContentOf(Service::PID_FILE);
}

/// One bit for each signal that the process handles; the lowest bit is for signal 1.
std::uint64_t CaughtSignals(pid_t process) {
    const auto signals = StatusOf(process, "SigCgt");
    return signals.empty() ? 0 : std::stoull(signals, nullptr, 16);
}

class StartUp : public ::testing::Test {
protected:
    /// Expects that the program receives and logs a report.
    void ExpectAReportIsTaken() {
        const auto before = m_service.LogLines("App/ReportServer:42 Recv").size();
        Service::Send(REPORT);
        EXPECT_TRUE(m_service.AwaitLines("App/ReportServer:42 Recv", before + 1));
    }

    Service m_service;
};

} // namespace

TEST_F(StartUp, LogsItsDestinationsAndNothingElse) {
    m_service.Install();
    m_service.Start();
    EXPECT_THAT(MessagesOf(m_service.LogLines()),
                ElementsAre("Add metrik module :A759", "FrameWorker load success"));
    EXPECT_EQ(m_service.Output().find("Error"), std::string::npos);
}

TEST_F(StartUp, LoadsNoLibraryOfTheNetworkWithoutACollector) {
    m_service.Install();
    m_service.Start();
    std::ifstream maps("/proc/" + std::to_string(m_service.Process()) + "/maps");
    const std::string text{std::istreambuf_iterator<char>(maps), {}};
    EXPECT_THAT(text, HasSubstr("libMetrikSdk.dylib"));
    EXPECT_THAT(text, Not(HasSubstr("libcurl")));
    EXPECT_THAT(text, Not(HasSubstr("libssl")));
}

TEST_F(StartUp, HoldsThePidFileAndAUmaskOfZero) {
    m_service.Install();
    m_service.Start();
    EXPECT_EQ(ContentOfPidFile(), std::to_string(m_service.Process()));
    EXPECT_EQ(ModeOf(Service::PID_FILE), 0666U);
    EXPECT_EQ(StatusOf(m_service.Process(), "Umask"), "0000");
}

TEST_F(StartUp, HandlesASegmentationFaultAndNoOtherSignal) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
    GTEST_SKIP() << "the sanitizers' runtimes handle signals themselves";
#endif
    m_service.Install();
    m_service.Start();
    Service::Send(EVENT);
    m_service.AwaitQuiet(); // now every plug-in has done something
    // The C library handles two signals itself, for its threads.
    constexpr std::uint64_t C_LIBRARY = std::uint64_t{3} << 31U;
    EXPECT_EQ(CaughtSignals(m_service.Process()) & ~C_LIBRARY, std::uint64_t{1} << (SIGSEGV - 1U));
}

TEST_F(StartUp, WithoutStandardDescriptorsNoFileOfItsOwnTakesTheirPlaces) {
    m_service.Install();
    m_service.CloseStandardDescriptors();
    m_service.Start();
    for (const std::string descriptor : {"0", "1", "2"})
        EXPECT_EQ(std::filesystem::read_symlink("/proc/" + std::to_string(m_service.Process()) + "/fd/" +
                                                descriptor),
                  "/dev/null");
    EXPECT_EQ(ContentOfPidFile(), std::to_string(m_service.Process()));
}

TEST_F(StartUp, ASecondInstanceIsRefusedAndTheFirstGoesOn) {
    m_service.Install();
    m_service.Start();
    Service::Send(REPORT);
    Service::Send(EVENT);
    Service::Send("no JSON");
    Service::Send(R"({"eventID":"B1","value":"it's"})");
    m_service.AwaitQuiet(); // none of these may have released the lock
    EXPECT_EQ(m_service.RunAnother(), 1);
    const auto locked = m_service.LogLines("App/MiniDump:318 IsAlreadyRun");
    EXPECT_THAT(MessagesOf(locked),
                ElementsAre("/Library/Preferences/hublink/Report.pid already locked, error: "
                            "Resource temporarily unavailable"));
    const auto refused = m_service.LogLines("App/main:14 main");
    EXPECT_THAT(MessagesOf(refused), ElementsAre("Process is already running"));
    EXPECT_EQ(refused[0].level, "INFO");
    EXPECT_NE(refused[0].process, m_service.Process());
    EXPECT_EQ(ContentOfPidFile(), std::to_string(m_service.Process()));
    EXPECT_TRUE(m_service.IsRunning());
    ExpectAReportIsTaken();
}

TEST_F(StartUp, AStalePidFileStopsNobody) {
    m_service.Install();
    std::ofstream(Service::PID_FILE) << "99999999999";
    m_service.Start();
    EXPECT_EQ(ContentOfPidFile(), std::to_string(m_service.Process()));
}

TEST_F(StartUp, RestartsRightAfterAKill) {
    m_service.Install();
    m_service.Start();
    Service::Send(REPORT);
    m_service.AwaitQuiet();
    m_service.Kill();
    m_service.Start();
    Service::Send(REPORT);
    m_service.AwaitQuiet();
    EXPECT_EQ(m_service.RowCount(), 2);
}

TEST_F(StartUp, RestartsWhileTheOldOneIsBeingKilled) {
    m_service.Install();
    pid_t old = m_service.LaunchAnother();
    const auto runs = [](pid_t process) {
        return ContentOfPidFile() == std::to_string(process) && Service::Bound();
    };
    const auto hasEnded = [](pid_t process) { return ::waitpid(process, nullptr, WNOHANG) == process; };
    ASSERT_TRUE(WaitUntil([&] { return runs(old); }));
    for (int i = 0; i < 10; ++i) {
        ::kill(old, SIGKILL);
        pid_t next = 0;
        do { // the new process is refused until the old one's lock is released
            next = m_service.LaunchAnother();
            ASSERT_TRUE(WaitUntil([&] { return runs(next) || hasEnded(next); }));
        } while (!runs(next));
        ::waitpid(old, nullptr, 0);
        EXPECT_TRUE(WaitUntil([] { return Service::Bound(); })) << "by the new one, the old one being gone";
        old = next;
    }
    EXPECT_EQ(m_service.Output().find("Address already in use"), std::string::npos) << m_service.Output();
    ::kill(old, SIGKILL);
    ::waitpid(old, nullptr, 0);
}

TEST_F(StartUp, WithoutTheLoggerItIsSilentAndWorks) {
    m_service.Install();
    const std::string outputOfInstallation = m_service.Output();
    m_service.Remove("libBoostLogger.dylib");
    m_service.Start();
    Service::Send("%s");
    Service::Send(REPORT);
    m_service.AwaitQuiet();
    EXPECT_THAT(m_service.Rows("eventID"), ElementsAre("B1"));
    EXPECT_EQ(m_service.Output(), outputOfInstallation) << "not even an error";
    EXPECT_FALSE(std::filesystem::exists(m_service.LogFile()));
    EXPECT_EQ(m_service.RunAnother(), 1) << "a second one is refused";
    m_service.Signal(SIGSEGV);
    EXPECT_EQ(m_service.AwaitEnd(), 0);
    EXPECT_EQ(m_service.Output(), outputOfInstallation);
}

TEST_F(StartUp, WithoutTheStoreItLogsThatOnceAndForwardsEvents) {
    m_service.Install();
    m_service.Remove("libOrvekSqlite.dylib");
    m_service.Start();
    Service::Send(REPORT);
    Service::Send(EVENT);
    EXPECT_TRUE(WaitUntil(
        [&] { return m_service.Count(m_service.OutboxFile(), "select count(*) from event") == 1; }));
    const auto messages = MessagesOf(m_service.LogLines());
    ASSERT_EQ(messages.size(), 4U)
        << "the module, the failure, the two datagrams; none for the row that is lost";
    EXPECT_THAT(messages[1],
                ::testing::MatchesRegex("Failed to load sqlite plugin:/.*/libOrvekSqlite.dylib"));
}

TEST_F(StartUp, WithoutTheSdkItLogsThatOnceAndStoresReports) {
    m_service.Install();
    m_service.Remove("libMetrikSdk.dylib");
    m_service.Start();
    Service::Send(EVENT);
    Service::Send(REPORT);
    m_service.AwaitQuiet();
    EXPECT_THAT(m_service.Rows("eventID"), ElementsAre("B1"));
    const auto failures = m_service.LogLines("Metrik/MetrikWorker:38 InitDefalut");
    ASSERT_EQ(failures.size(), 1U);
    EXPECT_EQ(failures[0].level, "ERROR");
    EXPECT_THAT(failures[0].message,
                ContainsRegex("^Failed to load metrik sdk interface:.*libMetrikSdk.dylib"));
}

TEST_F(StartUp, ALogThatCannotBeOpenedIsOneErrorOnStandardOutput) {
    m_service.Install();
    const std::string outputOfInstallation = m_service.Output();
    std::filesystem::remove_all(m_service.DataDirectory() + "/hublink/log");
    std::ofstream(m_service.DataDirectory() + "/hublink/log") << "a file where the directory should be";
    m_service.Start();
    Service::Send(REPORT);
    m_service.AwaitQuiet();
    EXPECT_THAT(
        m_service.Output().substr(outputOfInstallation.size()),
        ::testing::MatchesRegex("Error:\\[[-0-9]+ [:0-9]+\\]\\[STL ERR\\] .+ \\[BOOST ERR\\] .+\n\n"));
}

TEST_F(StartUp, AMissingLogDirectoryIsMade) {
    m_service.Install();
    std::filesystem::remove_all(m_service.DataDirectory() + "/hublink/log");
    m_service.Start();
    EXPECT_EQ(ModeOf(m_service.DataDirectory() + "/hublink/log/metrik"), 0700U);
    EXPECT_EQ(ModeOf(m_service.LogFile()), 0600U);
}

TEST_F(StartUp, WithoutThePreferencesDirectoryItEndsWithOne) {
    m_service.Install();
    std::filesystem::remove_all("/Library/Preferences/hublink"); // a directory of the sandbox
    m_service.Launch();
    EXPECT_EQ(m_service.AwaitEnd(), 1);
    EXPECT_THAT(MessagesOf(m_service.LogLines("App/MiniDump:304 IsAlreadyRun")),
                ElementsAre("Open file failed, error : No such file or directory"));
    EXPECT_FALSE(Service::Bound());
}

TEST_F(StartUp, WithAPidFileThatCannotBeWrittenItEndsWithOne) {
    m_service.Install();
    const MountedOver full("/dev/full", Service::PID_FILE);
    m_service.Launch();
    EXPECT_EQ(m_service.AwaitEnd(), 1);
    EXPECT_THAT(
        MessagesOf(m_service.LogLines("App/MiniDump:330 IsAlreadyRun")),
        ElementsAre(
            "Write file failed, file: /Library/Preferences/hublink/Report.pid, error: No space left on "
            "device"));
}

TEST_F(StartUp, OfManyStartedAtOnceOneStays) {
    m_service.Install();
    constexpr int MANY = 8;
    std::vector<pid_t> started;
    for (int i = 0; i < MANY; ++i)
        started.push_back(m_service.LaunchAnother());
    const auto refused = [&] { return m_service.LogLines("App/main:14 main").size(); };
    EXPECT_TRUE(WaitUntil([&] { return refused() == MANY - 1 && Service::Bound(); }));
    int running = 0;
    for (const pid_t process : started) {
        if (ContentOfPidFile() == std::to_string(process))
            ++running;
        ::kill(process, SIGKILL);
        ::waitpid(process, nullptr, 0);
    }
    EXPECT_EQ(running, 1) << "and its id stands in the file";
}

TEST_F(StartUp, WithoutADatabaseEachReportIsLoggedUntilSetUpHasMadeIt) {
    m_service.Install();
    std::filesystem::remove_all(m_service.DataDirectory() + "/hublink/database");
    m_service.Start();
    ExpectAReportIsTaken();
    EXPECT_TRUE(WaitUntil([&] {
        const auto lines = m_service.LogLines();
        return lines.back().site.ends_with(" ExecSql") && lines.back().level == "ERROR";
    }));
    EXPECT_FALSE(std::filesystem::exists(m_service.DatabaseFile())) << "the service makes none";
    m_service.Install();
    Service::Send(REPORT);
    m_service.AwaitQuiet();
    EXPECT_EQ(m_service.RowCount(), 1) << "picked up without a restart";
}

TEST_F(StartUp, WithoutTablesEachReportIsLoggedAndTheServiceGoesOn) {
    m_service.Install();
    EXPECT_THAT(m_service.Query(m_service.DatabaseFile(), "drop table OperLog"), IsEmpty());
    EXPECT_THAT(m_service.Query(m_service.DatabaseFile(), "drop table BaseInfo"), IsEmpty());
    m_service.Start();
    Service::Send(REPORT);
    EXPECT_TRUE(WaitUntil([&] {
        return MessagesOf(m_service.LogLines())
            .back()
            .starts_with("no such table: OperLog-insert into OperLog ");
    }));
    const auto messages = MessagesOf(m_service.LogLines());
    EXPECT_EQ(messages[1], "no such table: BaseInfo-select key ,value from BaseInfo ;");
    EXPECT_EQ(messages[2], "FrameWorker load success");
}

TEST_F(StartUp, ATakenPortIsPrintedAndTheServiceRunsOn) {
    m_service.Install();
    const std::string outputOfInstallation = m_service.Output();
    Poco::Net::DatagramSocket taken;
    taken.bind(Poco::Net::SocketAddress("127.0.0.1", 9997), false, false);
    m_service.Launch();
    EXPECT_TRUE(WaitUntil([&] { return m_service.Output().size() > outputOfInstallation.size(); }));
    EXPECT_EQ(m_service.Output().substr(outputOfInstallation.size()),
              "Poco exception: Net Exception: Address already in use: 127.0.0.1:9997\n");
    EXPECT_TRUE(m_service.IsRunning());
}

TEST_F(StartUp, ATerminationSignalEndsItWithoutARecord) {
    m_service.Install();
    m_service.Start();
    const std::string before = m_service.Log();
    m_service.Signal(SIGTERM);
    EXPECT_EQ(m_service.AwaitEnd(), -SIGTERM);
    EXPECT_EQ(m_service.Log(), before);
}
