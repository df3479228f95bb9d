#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <string>

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include "SystemTool/CommonTool.h"
#include "SystemTool/IO/Directory.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/WaitUntil.h"

using SystemTool::IO::Directory::GetExcutableDirectory;
using ::testing::ContainsRegex;
using ::testing::HasSubstr;
using ::testing::MatchesRegex;
using ::testing::StartsWith;

// The real main of the program, with a fake logger that copies each record to standard error.

namespace {

class Program {
public:
    /// `folder` holds the program and its plug-ins.
    explicit Program(const char* environment, rlim_t stackBytes = RLIM_INFINITY,
                     const std::string& folder = GetExcutableDirectory()) {
        if (::pipe(m_output) != 0)
            throw std::runtime_error("no pipe");
        ::setenv("XDG_DATA_HOME", m_data.Path().c_str(), 1); // where the program keeps its ledger
        m_process = ::fork();
        if (m_process == 0) {
            ::dup2(m_output[1], STDOUT_FILENO);
            ::dup2(m_output[1], STDERR_FILENO);
            ::setenv(environment, "1", 1);
            if (stackBytes != RLIM_INFINITY) {
                const rlimit limit{stackBytes, stackBytes};
                ::setrlimit(RLIMIT_STACK, &limit);
            }
            const std::string path = folder + "main_beside_fakes";
            ::execl(path.c_str(), path.c_str(), nullptr);
            ::_exit(127);
        }
        ::fcntl(m_output[0], F_SETFL, O_NONBLOCK);
    }
    ~Program() {
        if (m_process > 0) {
            ::kill(m_process, SIGKILL);
            ::waitpid(m_process, nullptr, 0);
        }
        ::close(m_output[0]);
        ::close(m_output[1]);
    }
    Program(const Program&) = delete;
    Program& operator=(const Program&) = delete;

    /// Waits until the program has written `text`. Returns all that it has written.
    std::string OutputUpTo(const std::string& text) {
        EXPECT_TRUE(WaitUntil([&] {
            char bytes[4096];
            const auto count = ::read(m_output[0], bytes, sizeof bytes);
            if (count > 0)
                m_text.append(bytes, static_cast<std::size_t>(count));
            return m_text.find(text) != std::string::npos;
        })) << m_text;
        return m_text;
    }

    bool IsRunning() const {
        siginfo_t state{};
        return ::waitid(P_PID, static_cast<id_t>(m_process), &state, WEXITED | WNOHANG | WNOWAIT) == 0 &&
               state.si_pid == 0;
    }

    /// Waits for the program's end. Returns the signal that ended it.
    int AwaitSignal() {
        int status = 0;
        ::waitpid(m_process, &status, 0);
        m_process = -1;
        return WIFSIGNALED(status) ? WTERMSIG(status) : 0;
    }

private:
    pid_t m_process;
    TemporaryDirectory m_data;
    int m_output[2];
    std::string m_text;
};

} // namespace

TEST(Main, ConfiguresTheLoggerBeforeAnythingIsLogged) {
    Program program("FAKE_LOGGER_ECHOES");
    EXPECT_THAT(program.OutputUpTo("FrameWorker load success"),
                StartsWith("InitLog " + SystemTool::CommonTool::GetUserDataDir() +
                           "/hublink/log/metrik Report.log QUILLON APP 10485760 104857600 1 0\n"));
}

TEST(Main, PrintsARefusedConfigurationAndGoesOn) {
    Program program("FAKE_LOGGER_REFUSES");
    const std::string line = program.OutputUpTo("\n\n");
    EXPECT_THAT(
        line, MatchesRegex("Error:\\[[-0-9]+ [:0-9]+\\]\\[STL ERR\\] no log \\[BOOST ERR\\] disk full\n\n"));
}

TEST(Main, CatchesNoOtherExceptionOfTheConfiguration) {
    Program program("FAKE_LOGGER_BREAKS");
    EXPECT_EQ(program.AwaitSignal(), SIGABRT);
}

TEST(Main, StaysWhenTheServerCannotStart) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
    GTEST_SKIP() << "the sanitizers' runtimes need threads themselves";
#endif
    // The stack of each thread is to have this size, so that no thread can start.
    constexpr rlim_t MORE_THAN_THERE_IS = rlim_t{1} << 46;
    Program program("FAKE_LOGGER_ECHOES", MORE_THAN_THERE_IS);
    const std::string output = program.OutputUpTo("[App/ReportServer:35 Start]");
    EXPECT_THAT(output, HasSubstr("Poco exception: ")) << "the receiving thread's, printed";
    EXPECT_THAT(output, HasSubstr("3 [App/ReportServer:35 Start] tag= Poco exception :"));
    EXPECT_TRUE(program.IsRunning());
}

TEST(Main, TakesThePathOfAMissingStorePluginForAFormat) {
    const TemporaryDirectory directory;
    const std::string folder = directory.Path() + "/100%s/";
    std::filesystem::create_directory(folder);
    for (const std::string file : {"main_beside_fakes", "libBoostLogger.dylib"})
        std::filesystem::copy_file(GetExcutableDirectory() + file, folder + file);
    Program program("FAKE_LOGGER_ECHOES", RLIM_INFINITY, folder);
    const std::string reason = "format-string referred to more arguments than were passed";
    EXPECT_THAT(program.OutputUpTo(reason), ContainsRegex("\n4 \\[Frame/FrameWorker:[0-9]+ Init\\] tag= "
                                                          "\\[BoostLogError\\]boost::too_few_args: " +
                                                          reason));
}
