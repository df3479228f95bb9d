// The plug-in, called through its two exports. The whole process has one sink, so each scenario runs in a
// child process, and the test examines the files that the child leaves.

#include <array>
#include <cstdio>
#include <cstdlib>
#include <memory>

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "SystemTool/BSException.h"
#include "tests/Modules/BoostLogger/LogFiles.h"
#include "tests/Modules/BoostLogger/Plugin.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/WaitUntil.h"

using SystemTool::BSException;
using testing::HasSubstr;
using testing::MatchesRegex;

namespace {

class BoostLogger : public testing::Test {
protected:
    /// Runs `scenario` in a child process whose standard output and standard error go to the file "output".
    template <typename Scenario>
    void RunInChild(Scenario scenario) {
        ChildProcess child([&] {
            const int output = open(m_output.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600);
            dup2(output, STDOUT_FILENO);
            dup2(output, STDERR_FILENO);
            return scenario();
        });
        ASSERT_EQ(child.Wait(), 0) << ContentOf(m_output);
    }

    /// The text of the exception that InitLog throws; empty when it throws none.
    static std::string InitError(LoggerLoader& loader, const LogArguments& arguments) {
        try {
            Init(loader, arguments);
            return "";
        } catch (const BSException& error) {
            return error.ErrorMsg();
        }
    }

    TemporaryDirectory m_temporary;
    const std::string m_directory = m_temporary.Path() + "/hublink/log";
    const std::string m_path = m_directory + "/Report.log";
    const std::string m_output = m_temporary.Path() + "/output";
};

std::string OutputOf(const std::string& command) {
    const std::unique_ptr<FILE, int (*)(FILE*)> pipe(popen(command.c_str(), "r"), pclose);
    std::string output;
    std::array<char, 4096> part{};
    while (pipe && std::fgets(part.data(), part.size(), pipe.get()) != nullptr)
        output += part.data();
    return output;
}

} // namespace

TEST_F(BoostLogger, ExportsItsTwoFunctionsAndNothingElse) {
    EXPECT_THAT(OutputOf("nm -D --defined-only --format=posix '" BOOST_LOGGER_PATH "' | cut -d' ' -f1"),
                "CreateModule\nDestoryModule\n");
}

TEST_F(BoostLogger, WritesNothingAnywhereBeforeItIsConfigured) {
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Log(loader, "nobody hears this", 5);
        return true;
    });
    EXPECT_EQ(ContentOf(m_output), "");
    EXPECT_FALSE(std::filesystem::exists(m_directory));
}

TEST_F(BoostLogger, WritesARecordAsOneLine) {
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {m_directory});
        Log(loader, "message\n2026-11-20 10:15:30.123 FATAL forged");
        return true;
    });
    EXPECT_THAT(ContentOf(m_path),
                MatchesRegex("[0-9]{4}-[0-9]{2}-[0-9]{2} [0-9]{2}:[0-9]{2}:[0-9]{2}\\.[0-9]{3} INFO  "
                             "\\[[0-9]+:[0-9]+\\] \\[App/ReportServer:42 Recv\\] "
                             "message\\\\n2026-11-20 10:15:30\\.123 FATAL forged\n"));
    EXPECT_EQ(ContentOf(m_output), "");
}

TEST_F(BoostLogger, HasNoRecordThatNobodyLogged) {
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {m_directory});
        return true;
    });
    EXPECT_TRUE(std::filesystem::exists(m_path));
    EXPECT_EQ(ContentOf(m_path), "");
}

TEST_F(BoostLogger, WritesTheRecordsOfEveryInstanceIntoTheOneSink) {
    RunInChild([&] {
        LoggerLoader before(BOOST_LOGGER_PATH);
        LoggerLoader configured(BOOST_LOGGER_PATH);
        Init(configured, {m_directory});
        LoggerLoader after(BOOST_LOGGER_PATH);
        Log(before, "one");
        Log(configured, "two");
        Log(after, "three");
        configured.Unload();
        Log(before, "four");
        return true;
    });
    const auto lines = ReadLines(m_path);
    ASSERT_EQ(lines.size(), 4U);
    EXPECT_EQ(MessageOf(lines[0]), "one");
    EXPECT_EQ(MessageOf(lines[2]), "three");
    EXPECT_EQ(MessageOf(lines[3]), "four");
}

TEST_F(BoostLogger, LogsOnAfterAllItsLoadersAreGoneAndItIsLoadedAgain) {
    RunInChild([&] {
        for (const char* message : {"first life", "second life"}) {
            LoggerLoader loader(BOOST_LOGGER_PATH);
            Init(loader, {m_directory});
            Log(loader, message);
        }
        return true;
    });
    EXPECT_EQ(ReadLines(m_path).size(), 2U);
}

TEST_F(BoostLogger, CopiesRecordsToStandardOutputWhenAsked) {
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {.directory = m_directory, .console = 1});
        Log(loader, "for both");
        return true;
    });
    EXPECT_THAT(ContentOf(m_output), HasSubstr("for both\n"));
    EXPECT_EQ(ContentOf(m_output), ContentOf(m_path));
}

TEST_F(BoostLogger, MakesPrivateFilesAndDirectoriesEvenWithoutAUmask) {
    RunInChild([&] {
        umask(0);
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {.directory = m_directory, .maxFileBytes = 100});
        for (int i = 0; i < 3; ++i)
            Log(loader, std::string(60, 'x'));
        return true;
    });
    EXPECT_EQ(ModeOf(m_temporary.Path() + "/hublink"), 0700U);
    EXPECT_EQ(ModeOf(m_directory), 0700U);
    ASSERT_EQ(LogFilesOf(m_directory).size(), 3U);
    for (const auto& path : LogFilesOf(m_directory))
        EXPECT_EQ(ModeOf(path), 0600U) << path;
}

TEST_F(BoostLogger, RotatesAndKeepsTheYoungestFilesWithinTheCap) {
    constexpr int RECORDS = 2000;
    RunInChild([&]() -> bool {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {.directory = m_directory, .maxFileBytes = 20'000, .maxTotalBytes = 100'000});
        for (int i = 0; i < RECORDS; ++i)
            Log(loader, std::to_string(i));
        std::exit(0); // which writes what waits
    });
    std::uintmax_t total = 0;
    for (const auto& path : LogFilesOf(m_directory)) {
        EXPECT_LE(std::filesystem::file_size(path), 20'000U) << path;
        total += std::filesystem::file_size(path);
    }
    EXPECT_LE(total, 100'000U);
    EXPECT_GT(total, 75'000U);
    const auto lines = ReadLog(m_directory);
    int expected = RECORDS - static_cast<int>(lines.size());
    for (const auto& line : lines)
        EXPECT_EQ(MessageOf(line), std::to_string(expected++));
}

TEST_F(BoostLogger, ThrowsWhenTheDirectoryCannotBeMade) {
    WriteFile(m_temporary.Path() + "/hublink", "a file in the way");
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        const std::string error = InitError(loader, {m_directory});
        std::printf("%s", error.c_str());
        std::fflush(stdout);
        Log(loader, "goes nowhere and does no harm");
        return !error.empty();
    });
    EXPECT_THAT(ContentOf(m_output),
                HasSubstr("[STL ERR] TEST APP has no log: cannot make the directory: Not a "
                          "directory, " +
                          m_path + ". Make sure that "));
    EXPECT_TRUE(ContentOf(m_output).ends_with(" [BOOST ERR] cannot make the directory: Not a directory\n"));
}

TEST_F(BoostLogger, ThrowsWhenTheFileCannotBeOpened) {
    std::filesystem::create_directories(m_path); // a directory under the file's name
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        return InitError(loader, {m_directory}).find("cannot open the file: Is a directory") !=
               std::string::npos;
    });
}

TEST_F(BoostLogger, CanBeConfiguredAfterAFailedAttempt) {
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        if (InitError(loader, {"/dev/null/log"}).empty())
            return false;
        Init(loader, {m_directory});
        Log(loader, "here at last");
        return true;
    });
    EXPECT_THAT(ContentOf(m_path), HasSubstr("here at last"));
}

TEST_F(BoostLogger, BeginsTheLogThatCouldNotBeOpenedAsSoonAsItCan) {
    std::filesystem::create_directories(m_path); // a directory under the file's name
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        const bool refused = !InitError(loader, {m_directory}).empty();
        Log(loader, "lost");
        std::filesystem::remove(m_path);
        return refused && WaitUntil([&] {
                   Log(loader, "here at last");
                   return ContentOf(m_path).find("here at last") != std::string::npos;
               });
    });
    EXPECT_THAT(ContentOf(m_path),
                HasSubstr(" records could not be written: cannot open the file: Is a directory\n"));
}

TEST_F(BoostLogger, WritesIntoOneLogOnlyAfterAFailedAttempt) {
    const std::string first = m_temporary.Path() + "/first";
    std::filesystem::create_directories(first + "/Report.log");
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        const bool refused = !InitError(loader, {first}).empty();
        Init(loader, {m_directory});
        std::filesystem::remove(first + "/Report.log");
        Log(loader, "once");
        return refused;
    });
    EXPECT_THAT(ContentOf(m_path), MatchesRegex("[^\n]*once\n"));
    EXPECT_FALSE(std::filesystem::exists(first + "/Report.log"));
}

TEST_F(BoostLogger, RefusesSettingsThatMakeNoLog) {
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        bool refused = !InitError(loader, {""}).empty();
        for (const std::string name : {"", ".", "..", "a/b", "/etc/passwd"})
            refused = refused && !InitError(loader, {.directory = m_directory, .fileName = name}).empty();
        refused = refused && !InitError(loader, {.directory = m_directory, .maxFileBytes = 0}).empty();
        return refused && !InitError(loader, {m_directory, 1000, 999}).empty();
    });
    EXPECT_FALSE(std::filesystem::exists(m_directory));
}

TEST_F(BoostLogger, TakesTheSameConfigurationTwiceButNoOther) {
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {m_directory});
        Init(loader, {m_directory});
        const std::string error = InitError(loader, {m_temporary.Path() + "/other"});
        Log(loader, "still here");
        return error.find("logs to " + m_path + " already") != std::string::npos;
    });
    EXPECT_FALSE(std::filesystem::exists(m_temporary.Path() + "/other"));
    EXPECT_EQ(ReadLines(m_path).size(), 1U);
}

TEST_F(BoostLogger, StaysWithItsDirectoryWhenTheProgramChangesToAnother) {
    RunInChild([&] {
        if (chdir(m_temporary.Path().c_str()) != 0)
            return false;
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {.directory = "hublink/log", .maxFileBytes = 100});
        if (chdir("/") != 0)
            return false;
        Log(loader, std::string(60, 'x'));
        Log(loader, std::string(60, 'y')); // this one rotates, so the file is opened again
        return true;
    });
    EXPECT_EQ(LogFilesOf(m_directory).size(), 2U);
}

TEST_F(BoostLogger, NeverThrowsOutOfWriteLogAndRecoversWhenTheDirectoryIsDeleted) {
    RunInChild([&] {
        LoggerLoader loader(BOOST_LOGGER_PATH);
        Init(loader, {m_directory});
        Log(loader, "one");
        std::filesystem::remove_all(m_directory);
        return WaitUntil([&] {
            Log(loader, "again");
            return std::filesystem::exists(m_path);
        });
    });
    EXPECT_EQ(MessageOf(ReadLines(m_path).front()), "again");
}
