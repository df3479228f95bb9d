// The logger with several threads and processes, and at the end of a process.

#include <chrono>
#include <csignal>
#include <cstdlib>
#include <map>
#include <thread>
#include <vector>

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "tests/Modules/BoostLogger/LogFiles.h"
#include "tests/Modules/BoostLogger/Plugin.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/WaitUntil.h"

using namespace std::chrono_literals;

namespace {

#if defined(__SANITIZE_THREAD__) || defined(__SANITIZE_ADDRESS__)
constexpr int MANY = 5'000; // with a sanitizer, a record takes ten times as long
#else
constexpr int MANY = 100'000;
#endif

#if defined(__SANITIZE_THREAD__)
constexpr int EXITS = 3; // this sanitizer sleeps for a second in each exit
#else
constexpr int EXITS = 20;
#endif

class BoostLoggerProcesses : public testing::Test {
protected:
    /// Logs "<name> <number>" for the numbers from 0 on.
    static void LogNumbers(SystemTool::IO::ILogger* logger, const std::string& name, int count) {
        for (int i = 0; i < count; ++i)
            Log(logger, name + " " + std::to_string(i));
    }

    /// Ends a child by exit, as a program ends. The lines that wait are written then.
    [[noreturn]] static bool Ended() { std::exit(0); }

    /// Logs a thousand records in a burst and one of `level` after them, in a process that is killed then. So
    /// no end of a process writes the lines that wait. Expects all records in the log.
    void ExpectAllAfterAKillBehind(int level) {
        ChildProcess child([&] {
            LoggerLoader loader(BOOST_LOGGER_PATH);
            Init(loader, {m_temporary.Path()});
            LogNumbers(loader.GetModule(), "t", 1000);
            Log(loader, "t 1000", level);
            raise(SIGKILL);
            return true;
        });
        ASSERT_EQ(child.Wait(), 128 + SIGKILL);
        ExpectNumbers({"t"}, 1001);
    }

    /// Expects that the log has, for each name, exactly the numbers from 0 to `count` - 1, in order.
    void ExpectNumbers(const std::vector<std::string>& names, int count) {
        std::map<std::string, int> next;
        for (const auto& line : ReadLog(m_temporary.Path())) {
            const std::string message = MessageOf(line);
            const std::string name = message.substr(0, message.find(' '));
            ASSERT_EQ(message, name + " " + std::to_string(next[name])) << line;
            ++next[name];
        }
        ASSERT_EQ(next.size(), names.size());
        for (const auto& name : names)
            EXPECT_EQ(next[name], count) << name;
    }

    TemporaryDirectory m_temporary;
    const std::string m_path = m_temporary.Path() + "/Report.log";
};

/// Logs for ever on a thread of its own. When the service crashes, its threads log like this while exit()
/// runs.
void LogForEver(SystemTool::IO::ILogger* logger, const char* name) {
    std::thread([logger, name] {
        for (long i = 0;; ++i)
            Log(logger, std::string(name) + " " + std::to_string(i));
    }).detach();
}

/// Logs while the statics are destroyed. It is made before the loader, so it is destroyed after the loader.
struct LateStatic {
    ~LateStatic() {
        if (logger != nullptr)
            Log(logger, "after the loader's end");
    }
    SystemTool::IO::ILogger* logger = nullptr;
};

SystemTool::IO::ILogger* StaticLogger(const std::string& directory) {
    static LateStatic late;
    static LoggerLoader loader(BOOST_LOGGER_PATH);
    Init(loader, {directory});
    late.logger = loader.GetModule();
    return late.logger;
}

} // namespace

TEST_F(BoostLoggerProcesses, EightThreadsGetEveryRecordOutWholeAndInOrder) {
    std::vector<std::string> names;
    for (int thread = 0; thread < 8; ++thread)
        names.push_back("t" + std::to_string(thread));
    ChildProcess child([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {m_temporary.Path(), 10 * 1024 * 1024, 1024 * 1024 * 1024});
        std::vector<std::thread> threads;
        for (const auto& name : names)
            threads.emplace_back([&] { LogNumbers(loader.GetModule(), name, MANY); });
        for (auto& thread : threads)
            thread.join();
        return Ended();
    });
    ASSERT_EQ(child.Wait(), 0);
    ExpectNumbers(names, MANY);
}

TEST_F(BoostLoggerProcesses, TwoProcessesOnOneLogLoseAndTearNothingWhileBothRotate) {
    constexpr int COUNT = MANY / 5;
    const auto scenario = [&](const char* name) {
        return [this, name] {
            LoggerLoader loader(BOOST_LOGGER_PATH);
            Init(loader, {m_temporary.Path(), 50'000, 1024 * 1024 * 1024});
            LogNumbers(loader.GetModule(), name, COUNT);
            return Ended();
        };
    };
    ChildProcess one(scenario("one"));
    ChildProcess other(scenario("other"));
    ASSERT_EQ(one.Wait(), 0);
    ASSERT_EQ(other.Wait(), 0);
    ExpectNumbers({"one", "other"}, COUNT);
    EXPECT_GT(LogFilesOf(m_temporary.Path()).size(), 3U);
    // Each process may write sixteen records too many.
    for (const auto& path : LogFilesOf(m_temporary.Path()))
        EXPECT_LE(std::filesystem::file_size(path), 50'000U + 2 * 16 * 100) << path;
}

TEST_F(BoostLoggerProcesses, ASecondInstanceThatIsRefusedLeavesTheLogOfTheFirstAlone) {
    constexpr int COUNT = MANY / 5;
    ChildProcess first([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {m_temporary.Path()});
        LogNumbers(loader.GetModule(), "first", COUNT);
        return Ended();
    });
    ASSERT_TRUE(WaitUntil([&] { return !ContentOf(m_path).empty(); }));
    struct stat before {};
    ASSERT_EQ(stat(m_path.c_str(), &before), 0);
    ChildProcess second([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {m_temporary.Path()});
        Log(loader, "second 0");
        return Ended();
    });
    EXPECT_EQ(second.Wait(), 0);
    EXPECT_EQ(first.Wait(), 0);

    struct stat after {};
    ASSERT_EQ(stat(m_path.c_str(), &after), 0);
    EXPECT_EQ(after.st_ino, before.st_ino);
    int fromFirst = 0;
    int fromSecond = 0;
    for (const auto& line : ReadLines(m_path)) {
        if (MessageOf(line) == "second 0")
            ++fromSecond;
        else
            ASSERT_EQ(MessageOf(line), "first " + std::to_string(fromFirst++));
    }
    EXPECT_EQ(fromFirst, COUNT);
    EXPECT_EQ(fromSecond, 1);
}

TEST_F(BoostLoggerProcesses, ARecordIsInTheFileWhenWriteLogReturnsEvenIfTheProcessIsKilledThen) {
    ChildProcess child([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {m_temporary.Path()});
        LogNumbers(loader.GetModule(), "last", 3);
        raise(SIGKILL);
        return true;
    });
    EXPECT_EQ(child.Wait(), 128 + SIGKILL);
    ExpectNumbers({"last"}, 3);
}

TEST_F(BoostLoggerProcesses, AKillInABurstCostsSixteenRecordsAtMost) {
    ChildProcess child([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {m_temporary.Path()});
        LogNumbers(loader.GetModule(), "t", 1000);
        raise(SIGKILL);
        return true;
    });
    EXPECT_EQ(child.Wait(), 128 + SIGKILL);
    const auto lines = ReadLog(m_temporary.Path());
    ASSERT_GE(lines.size(), 1000U - 15U);
    for (std::size_t i = 0; i < lines.size(); ++i)
        ASSERT_EQ(MessageOf(lines[i]), "t " + std::to_string(i));
}

TEST_F(BoostLoggerProcesses, AWarningIsInTheFileAtOnceWithAllRecordsBeforeIt) {
    ExpectAllAfterAKillBehind(3);
}

TEST_F(BoostLoggerProcesses, AnErrorAsInACrashTraceIsInTheFileAtOnceWithAllRecordsBeforeIt) {
    ExpectAllAfterAKillBehind(4);
}

TEST_F(BoostLoggerProcesses, ExitEndsWhileOtherThreadsAreLogging) {
    for (int round = 0; round < EXITS; ++round) {
        const TemporaryDirectory directory;
        ChildProcess child([&]() -> bool {
            auto* const logger = StaticLogger(directory.Path());
            LogForEver(logger, "a");
            LogForEver(logger, "b");
            Log(logger, "about to exit");
            std::exit(0);
        });
        EXPECT_TRUE(WaitUntil([&] { return child.HasEnded(); }, 5s)) << "round " << round;
        EXPECT_EQ(child.Status(), 0) << "round " << round;
        std::string all;
        for (const auto& line : ReadLog(directory.Path()))
            all += MessageOf(line) + "\n";
        EXPECT_NE(all.find("after the loader's end\n"), std::string::npos);
    }
}

TEST_F(BoostLoggerProcesses, UnloadingTheLastLoaderDoesNotHarmAThreadThatIsLogging) {
    ChildProcess child([&] {
        auto loader = std::make_unique<LoggerLoader>(BOOST_LOGGER_PATH);
        Init(*loader, {m_temporary.Path()});
        auto* const logger = loader->GetModule();
        std::thread thread([logger] { LogNumbers(logger, "t", 20'000); });
        loader.reset();
        thread.join();
        return Ended();
    });
    ASSERT_EQ(child.Wait(), 0);
    ExpectNumbers({"t"}, 20'000);
}

// The thread sanitizer rightly reports that a signal handler must not use a logger.
#if !defined(__SANITIZE_THREAD__)
namespace {

SystemTool::IO::ILogger* g_crashLogger = nullptr;

void LogAndExit(int signal) {
    Log(g_crashLogger, "Signal[" + std::to_string(signal) + "]", 4);
    std::exit(0);
}

} // namespace

TEST_F(BoostLoggerProcesses, ACrashHandlerCanLogAndExitWhileOtherThreadsAreLogging) {
    ChildProcess child([&]() -> bool {
        g_crashLogger = StaticLogger(m_temporary.Path());
        std::signal(SIGSEGV, LogAndExit);
        LogForEver(g_crashLogger, "a");
        LogForEver(g_crashLogger, "b");
        raise(SIGSEGV);
        return false;
    });
    EXPECT_TRUE(WaitUntil([&] { return child.HasEnded(); }, 5s));
    EXPECT_EQ(child.Status(), 0);
    EXPECT_NE(ContentOf(m_path).find("] Signal[11]\n"), std::string::npos);
}
#endif
