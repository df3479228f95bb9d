#include <csignal>
#include <filesystem>
#include <sstream>
#include <string>

#include <gtest/gtest.h>
#include <sys/wait.h>

#include "tests/e2e/support/Service.h"
#include "tests/e2e/support/SteadyReports.h"
#include "tests/support/WaitUntil.h"

// `reportctl tail` beside a service that is busy.

namespace {

using namespace std::chrono_literals;

/// A rotation comes every two seconds.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr std::size_t VALUE_BYTES = 9'000;
constexpr std::size_t ROTATIONS = 1;
#else
constexpr std::size_t VALUE_BYTES = 3'000;
constexpr std::size_t ROTATIONS = 2;
#endif

/// The beginning of the datagram with this number.
std::string IdOf(int number) {
    return R"("eventID":"B1|)" + std::to_string(number) + '"';
}

std::string Numbered(int number) {
    return "{" + IdOf(number) + R"(,"value":")" + std::string(VALUE_BYTES, 'x') +
           R"(","createTime":1700000000})";
}

class Follow : public testing::Test {
protected:
    void SetUp() override {
        m_service.Install();
        m_service.Start();
    }

    std::size_t LogFiles() const {
        const auto directory = std::filesystem::path(m_service.LogFile()).parent_path();
        return static_cast<std::size_t>(std::distance(std::filesystem::directory_iterator(directory), {}));
    }

    /// Whether `tail` has printed the datagram with this number.
    bool Has(int number) const { return m_service.Output().find(IdOf(number)) != std::string::npos; }

    static int CodeOfEnd(pid_t process) {
        int status = 0;
        ::waitpid(process, &status, 0);
        return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
    }

    Service m_service;
};

TEST_F(Follow, LosesNoLineOfTwoThousandASecondOverRotationsAndEndsWithZeroByCtrlC) {
    const auto tail = m_service.LaunchReportctl({"tail", "--json", "--since", "1h"});
    int sent = 0;
    {
        SteadyReports reports(Numbered);
        EXPECT_TRUE(WaitUntil([&] { return LogFiles() > ROTATIONS; }, 60s));
        sent = reports.Stop();
    }
    EXPECT_TRUE(WaitUntil([&] { return Has(sent - 1); }, 10s)) << "it does not keep up";
    ::kill(tail, SIGINT);
    EXPECT_EQ(CodeOfEnd(tail), 0);

    std::istringstream lines(m_service.Output());
    int expected = 0;
    int stored = 0;
    for (std::string line; std::getline(lines, line);) {
        if (line.find("\"kind\":\"report\"") == std::string::npos)
            continue;
        EXPECT_NE(line.find(IdOf(expected)), std::string::npos) << line.substr(0, 100);
        stored += line.find("\"outcome\":\"stored\"") != std::string::npos ? 1 : 0;
        ++expected;
    }
    EXPECT_EQ(expected, sent);
#if !defined(__SANITIZE_THREAD__) // there, a line has to wait for its row for longer than a second
    EXPECT_GE(stored, sent * 99 / 100);
#endif
}

} // namespace
