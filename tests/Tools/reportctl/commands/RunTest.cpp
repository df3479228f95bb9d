#include <csignal>
#include <filesystem>
#include <fstream>

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/Tools/reportctl/support/ReportctlFixture.h"
#include "tests/support/WaitUntil.h"

namespace {

constexpr auto PID_FILE = "/Library/Preferences/hublink/Report.pid";

/// Holds the pid file's lock, as the service of another user does.
class Lock {
public:
    Lock() : m_file(::open(PID_FILE, O_RDWR | O_CREAT | O_CLOEXEC, 0666)) {
        struct flock whole {};
        whole.l_type = F_WRLCK;
        whole.l_whence = SEEK_SET;
        EXPECT_EQ(::fcntl(m_file, F_SETLK, &whole), 0);
    }
    ~Lock() { Release(); }
    Lock(const Lock&) = delete;
    Lock& operator=(const Lock&) = delete;

    void Release() {
        if (m_file >= 0)
            ::close(m_file);
        m_file = -1;
    }

    /// Whether the kernel says that this process waits for the lock.
    static bool IsWaitedForBy(pid_t process) {
        std::ifstream locks("/proc/locks");
        for (std::string line; std::getline(locks, line);)
            if (line.find("->") != std::string::npos &&
                line.find(" " + std::to_string(process) + " ") != std::string::npos)
                return true;
        return false;
    }

private:
    int m_file;
};

class RunCommand : public ReportctlFixture {
protected:
    ~RunCommand() override {
        if (m_process > 0) {
            ::kill(m_process, SIGKILL);
            ::waitpid(m_process, nullptr, 0);
        }
    }

    void Start(const std::string& program = REPORTCTL) {
        std::filesystem::create_directories(Data());
        m_process = ::fork();
        if (m_process == 0) {
            ::setenv("XDG_DATA_HOME", Data().c_str(), 1);
            ::execl(program.c_str(), program.c_str(), "run", nullptr);
            ::_exit(99);
        }
    }

    /// Whether the process now runs the service's program, which reportctl starts in its own process.
    bool IsService() const {
        std::error_code error;
        const auto program =
            std::filesystem::read_symlink("/proc/" + std::to_string(m_process) + "/exe", error);
        return program.filename() == "SyncServiceReport";
    }

    bool HoldsLock() const { return ContentOf(PID_FILE) == std::to_string(m_process); }

    pid_t m_process = -1;
};

TEST_F(RunCommand, BecomesTheServiceWhenNoOtherRuns) {
    Start();
    EXPECT_TRUE(WaitUntil([this] { return IsService() && HoldsLock(); }));
}

TEST_F(RunCommand, WaitsWhileAnotherServiceHoldsTheLockAndTakesOverWhenItEnds) {
    Lock other;
    Start();
    ASSERT_TRUE(WaitUntil([this] { return Lock::IsWaitedForBy(m_process); }));
    EXPECT_FALSE(IsService());
    EXPECT_FALSE(std::filesystem::exists(Data() + "/hublink/log")) << "waiting leaves no line in a log";
    other.Release();
    EXPECT_TRUE(WaitUntil([this] { return IsService() && HoldsLock(); }));
}

TEST_F(RunCommand, SaysWhenTheServiceIsNotInstalled) {
    const TemporaryDirectory alone;
    std::filesystem::copy_file(REPORTCTL, alone.Path() + "/reportctl");
    const auto outcome = Run(alone.Path() + "/reportctl run");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says("SyncServiceReport is not installed beside reportctl")) << outcome.output;
}

} // namespace
