#include <filesystem>
#include <fstream>

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "tests/Tools/reportctl/support/ReportctlFixture.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/OtherUser.h"

// What `reportctl status` says while no service can start.

namespace {

namespace fs = std::filesystem;
using ::testing::HasSubstr;
using ::testing::Not;

constexpr auto PID_FILE = "/Library/Preferences/hublink/Report.pid";
constexpr auto NAME = "reportctl_send_tests"; // this program

class StatusCommand : public ReportctlFixture {
protected:
    ~StatusCommand() override { fs::remove(PID_FILE); }

    static void MakePidFile() {
        std::ofstream(PID_FILE).close();
        fs::permissions(PID_FILE, fs::perms{0666});
    }

    /// Locks the pid file in this way, and says so.
    static int Hold(int command, const ChildProcess::Tell& tell) {
        const int file = ::open(PID_FILE, O_RDWR | O_CLOEXEC);
        struct flock whole {};
        whole.l_type = F_WRLCK;
        whole.l_whence = SEEK_SET;
        if (::fcntl(file, command, &whole) != 0)
            return 1;
        tell();
        return ::pause();
    }

    std::string Status(const std::string& arguments = {}) const {
        const auto outcome = Reportctl("status " + arguments);
        EXPECT_EQ(outcome.exitCode, 2);
        EXPECT_THAT(outcome.output, Not(HasSubstr("Start it")));
        EXPECT_THAT(outcome.output, Not(HasSubstr("Install the service again")));
        return outcome.output;
    }
};

} // namespace

TEST_F(StatusCommand, NamesAnotherProgramOfTheUserThatHoldsTheLock) {
    MakePidFile();
    ChildProcess holder([](const auto& tell) { return Hold(F_SETLK, tell); });
    ASSERT_TRUE(holder.WaitUntilItTold());
    const std::string user = "root"; // as every user is in the sandbox
    const auto process = std::to_string(holder.Pid());
    const auto text = Status("--json");
    EXPECT_THAT(text,
                HasSubstr(std::string("\"The lock of ") + PID_FILE + " is held by " + NAME + " of user " +
                          user + " (process " + process + "), so no service can start. End that program.\""));
    EXPECT_THAT(text, HasSubstr("\"lockHolder\": {\n      \"pid\": " + process + ",\n      \"name\": \"" +
                                NAME + "\",\n      \"user\": \"" + user + "\"\n    }"));
    EXPECT_THAT(text, HasSubstr("\"running\": false"));
}

TEST_F(StatusCommand, NamesAProgramOfAnotherUserThatHoldsTheLock) {
    if (!OtherUser::Does([] { return true; }))
        GTEST_SKIP() << "only the machine's root can act as another user";
    MakePidFile();
    ChildProcess holder([](const auto& tell) {
        return ::setgid(OtherUser::ID) == 0 && ::setuid(OtherUser::ID) == 0 ? Hold(F_SETLK, tell) : 1;
    });
    ASSERT_TRUE(holder.WaitUntilItTold());
    const auto text = Status("--json");
    EXPECT_THAT(text, HasSubstr(std::string("is held by ") + NAME + " of user nobody (process " +
                                std::to_string(holder.Pid()) + "), so no service can start."));
    EXPECT_THAT(text, Not(HasSubstr("The service of user")));
}

TEST_F(StatusCommand, SaysSoWhenTheHolderOfTheLockCannotBeKnown) {
    MakePidFile();
    ChildProcess holder([](const auto& tell) { return Hold(F_OFD_SETLK, tell); });
    ASSERT_TRUE(holder.WaitUntilItTold());
    const auto text = Status("--json");
    EXPECT_THAT(text,
                HasSubstr("is held by a program that this user may not see. Your service can run when"));
    EXPECT_THAT(text, HasSubstr(R"("lockHolder": {
      "pid": null,
      "name": null,
      "user": null
    })"));
}

TEST_F(StatusCommand, SaysSoWhenThereIsNoRegularFileToLock) {
    const auto expected = std::string(PID_FILE) +
                          " is no regular file. Remove it, run `reportctl setup`, and start the service.";
    fs::create_directory(PID_FILE);
    EXPECT_THAT(Status(), HasSubstr(expected));
    fs::remove(PID_FILE);
    fs::create_symlink("/dev/null", PID_FILE);
    EXPECT_THAT(Status(), HasSubstr(expected));
}

TEST_F(StatusCommand, SaysToStartTheServiceWhenTheLockIsFree) {
    MakePidFile();
    const auto outcome = Reportctl("status --json");
    EXPECT_EQ(outcome.exitCode, 2);
    EXPECT_THAT(outcome.output, HasSubstr("The service is not running. Start it"));
    EXPECT_THAT(outcome.output, HasSubstr("\"lockHolder\": null"));
}
