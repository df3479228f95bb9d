#include "App/MiniDump.h"

#include <csignal>
#include <cstdarg>
#include <filesystem>
#include <fstream>
#include <map>
#include <sstream>
#include <thread>

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/fakes/FakeLogger.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/FileContent.h"
#include "tests/support/MountedOver.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/WaitUntil.h"

using ::testing::ElementsAre;
using ::testing::ExitedWithCode;
using ::testing::IsEmpty;
using ::testing::KilledBySignal;

namespace {

/// The error of the next lock; 0 lets the lock really be tried.
int g_lockError = 0;

} // namespace

// The linker redirects the program's calls of fcntl here, so that a lock can fail in a way that no file
// system of this machine does. Both names are replaced, because the headers choose one of them.
extern "C" int __real_fcntl64(int file, int command, ...);
extern "C" int __wrap_fcntl64(int file, int command, ...) {
    if (g_lockError != 0) {
        errno = g_lockError;
        return -1;
    }
    va_list arguments;
    va_start(arguments, command);
    void* const argument = va_arg(arguments, void*);
    va_end(arguments);
    return __real_fcntl64(file, command, argument);
}

namespace {

const std::filesystem::path DIRECTORY = "/Library/Preferences/hublink"; // a directory of the sandbox
const std::filesystem::path PID_FILE = DIRECTORY / "Report.pid";

constexpr int RUNS_ALREADY = 101;
constexpr int IS_THE_ONE = 102;

LogRecord Record(int level, int line, const std::string& message) {
    return {level, "App/MiniDump", "IsAlreadyRun", line, message};
}

/// Runs `body` in a child process and returns the child's exit code, which is the result of `body`.
template <typename Body>
int ExitCodeOfChild(Body body) {
    return ChildProcess(body).Wait();
}

int IsAlreadyRunAsCode() {
    return MiniDump::IsAlreadyRun() ? RUNS_ALREADY : IS_THE_ONE;
}

std::ptrdiff_t DescriptorCount() {
    return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
}

std::string ContentOfPidFile() {
    return ContentOf(PID_FILE);
}

class InstanceGuard : public ::testing::Test {
protected:
    InstanceGuard() {
        for (const auto& entry : std::filesystem::directory_iterator(DIRECTORY))
            std::filesystem::remove(entry);
        MiniDump::EnableAutoStack("/logs", "Report");
    }
};

/// A separate process that holds the lock until the destructor ends it.
class Holder {
public:
    Holder() {
        int ready[2];
        if (::pipe(ready) != 0)
            throw std::runtime_error("no pipe");
        m_process = ::fork();
        if (m_process == 0) {
            const char byte = MiniDump::IsAlreadyRun() ? 'n' : 'y';
            [[maybe_unused]] const auto written = ::write(ready[1], &byte, 1);
            for (;;)
                ::pause();
        }
        char byte = 0;
        EXPECT_EQ(::read(ready[0], &byte, 1), 1);
        EXPECT_EQ(byte, 'y');
        ::close(ready[0]);
        ::close(ready[1]);
    }
    ~Holder() { Kill(); }

    void Kill() {
        if (m_process > 0) {
            ::kill(m_process, SIGKILL);
            ::waitpid(m_process, nullptr, 0);
        }
        m_process = -1;
    }
    pid_t Process() const { return m_process; }

private:
    pid_t m_process;
};

class CrashHandlerDeathTest : public ::testing::Test {
protected:
    CrashHandlerDeathTest() {
        MiniDump::EnableAutoStack("/logs", "Report");
        FakeLogger().echoes = true;
    }
};

#define RECORD_240 "4 \\[App/MiniDump:240 OnStackCallBack\\] tag= Signal\\[11\\] reserved=0"
#define RECORD_252 "4 \\[App/MiniDump:252 OnStackCallBack\\] tag= \\[.+\\] reserved=0"

sighandler_t HandlerOf(int signal) {
    struct sigaction action {};
    ::sigaction(signal, nullptr, &action);
    return action.sa_handler;
}

/// Makes `depth` nested calls and crashes in the innermost. The result is used after the call, so that the
/// compiler keeps the calls.
[[gnu::noinline]] int CrashAt(int depth) {
    volatile int result = depth == 0 ? ::raise(SIGSEGV) : CrashAt(depth - 1);
    return result + 1;
}

} // namespace

// --- the instance guard

TEST_F(InstanceGuard, WritesThisProcessesIdAndNothingElse) {
    EXPECT_FALSE(MiniDump::IsAlreadyRun());
    EXPECT_EQ(ContentOfPidFile(), std::to_string(::getpid()));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(InstanceGuard, MakesTheFileForEveryUserWhateverTheUmaskAndLeavesTheUmaskAtZero) {
    ::umask(077);
    EXPECT_FALSE(MiniDump::IsAlreadyRun());
    EXPECT_EQ(::umask(022), 0U);
    struct stat status {};
    ASSERT_EQ(::stat(PID_FILE.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0666U);
}

TEST_F(InstanceGuard, OverwritesAStaleAndLongerId) {
    std::ofstream(PID_FILE) << "99999999999";
    EXPECT_FALSE(MiniDump::IsAlreadyRun());
    EXPECT_EQ(ContentOfPidFile(), std::to_string(::getpid()));
}

TEST_F(InstanceGuard, ASecondProcessIsRefusedAndSaysWhy) {
    const Holder holder;
    EXPECT_TRUE(MiniDump::IsAlreadyRun());
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(Record(
                    2, 318,
                    "/Library/Preferences/hublink/Report.pid already locked, error: Resource temporarily "
                    "unavailable")));
    EXPECT_EQ(ContentOfPidFile(), std::to_string(holder.Process())) << "the winner's id is left alone";
}

TEST_F(InstanceGuard, ARefusedProcessLeavesNoDescriptorBehind) {
    const Holder holder;
    const auto before = DescriptorCount();
    EXPECT_TRUE(MiniDump::IsAlreadyRun());
    EXPECT_EQ(DescriptorCount(), before);
}

TEST_F(InstanceGuard, TheLockGoesWithItsProcessHoweverItEnds) {
    Holder holder;
    EXPECT_EQ(ExitCodeOfChild(IsAlreadyRunAsCode), RUNS_ALREADY);
    holder.Kill();
    EXPECT_EQ(ExitCodeOfChild(IsAlreadyRunAsCode), IS_THE_ONE);
}

TEST_F(InstanceGuard, TheLockReachesBeyondTheEndOfTheFile) {
    const Holder holder;
    const int file = ::open(PID_FILE.c_str(), O_RDWR);
    struct flock far {};
    far.l_type = F_WRLCK;
    far.l_whence = SEEK_SET;
    far.l_start = 1'000'000;
    far.l_len = 1;
    EXPECT_EQ(::fcntl(file, F_SETLK, &far), -1);
    ::close(file);
}

TEST_F(InstanceGuard, ClosingTheFileAnywhereInTheProcessDropsTheLock) {
    EXPECT_FALSE(MiniDump::IsAlreadyRun());
    EXPECT_EQ(ExitCodeOfChild(IsAlreadyRunAsCode), RUNS_ALREADY);
    ::close(::open(PID_FILE.c_str(), O_RDONLY));
    EXPECT_EQ(ExitCodeOfChild(IsAlreadyRunAsCode), IS_THE_ONE) << "so nothing else may open it";
}

TEST_F(InstanceGuard, ASecondCallInTheProcessSucceeds) {
    EXPECT_FALSE(MiniDump::IsAlreadyRun());
    const auto before = DescriptorCount();
    EXPECT_FALSE(MiniDump::IsAlreadyRun());
    EXPECT_EQ(DescriptorCount(), before + 1) << "with a descriptor of its own";
}

TEST_F(InstanceGuard, WithoutANameTheFileIsNamedByItsEndingAlone) {
    MiniDump::EnableAutoStack("", "");
    EXPECT_FALSE(MiniDump::IsAlreadyRun());
    EXPECT_TRUE(std::filesystem::exists(DIRECTORY / ".pid"));
}

TEST_F(InstanceGuard, ALockThatFailsWithoutAHolderCountsAsTaken) {
    for (const int error : {ENOLCK, EINVAL, EBADF}) {
        g_lockError = error;
        EXPECT_FALSE(MiniDump::IsAlreadyRun());
    }
    EXPECT_EQ(ContentOfPidFile(), std::to_string(::getpid()));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
    for (const int error : {EACCES, EAGAIN}) {
        g_lockError = error;
        EXPECT_TRUE(MiniDump::IsAlreadyRun());
    }
    g_lockError = 0;
}

TEST_F(InstanceGuard, AFileThatCannotBeOpenedEndsTheProcess) {
    FakeLogger().echoes = true;
    std::filesystem::remove(DIRECTORY);
    EXPECT_EXIT(MiniDump::IsAlreadyRun(), ExitedWithCode(1),
                "2 \\[App/MiniDump:304 IsAlreadyRun\\] tag= Open file failed, error : No such file or "
                "directory reserved=0");
    FakeLogger().throws = Throws::Std;
    EXPECT_EXIT(MiniDump::IsAlreadyRun(), ExitedWithCode(1), "") << "with a logger that fails, too";
    std::filesystem::create_directory(DIRECTORY);
}

TEST_F(InstanceGuard, ALinkInThePlaceOfTheFileIsNotFollowed) {
    FakeLogger().echoes = true;
    const TemporaryDirectory elsewhere;
    const std::string another = elsewhere.Path() + "/another users file";
    std::ofstream(another) << "content";
    std::filesystem::create_symlink(another, PID_FILE);
    EXPECT_EXIT(MiniDump::IsAlreadyRun(), ExitedWithCode(1),
                "2 \\[App/MiniDump:304 IsAlreadyRun\\] tag= Open file failed, error : Too many levels of "
                "symbolic links reserved=0");
    std::string content;
    std::getline(std::ifstream(another), content);
    EXPECT_EQ(content, "content");
}

TEST_F(InstanceGuard, AFileThatCannotBeWrittenEndsTheProcess) {
    FakeLogger().echoes = true;
    const MountedOver full("/dev/full", PID_FILE);
    EXPECT_EXIT(MiniDump::IsAlreadyRun(), ExitedWithCode(1),
                "2 \\[App/MiniDump:330 IsAlreadyRun\\] tag= Write file failed, file: "
                "/Library/Preferences/hublink/Report.pid, error: No space left on device reserved=0");
}

// --- the crash handler

TEST(CrashHandler, IsInstalledForASegmentationFaultAndNoOtherSignal) {
    std::vector<int> changed;
    std::map<int, sighandler_t> before;
    for (int signal = 1; signal < SIGRTMIN; ++signal)
        before[signal] = HandlerOf(signal);
    MiniDump::EnableAutoStack("/logs", "Report");
    for (const auto& [signal, handler] : before)
        if (HandlerOf(signal) != handler)
            changed.push_back(signal);
    EXPECT_THAT(changed, ElementsAre(SIGSEGV));
}

TEST_F(CrashHandlerDeathTest, LogsTheSignalAndTheFramesAndExitsWithZero) {
    EXPECT_EXIT(::raise(SIGSEGV), ExitedWithCode(0), "^" RECORD_240 "\n(" RECORD_252 "\n)+$");
}

TEST_F(CrashHandlerDeathTest, HandlesAFaultOfAnotherThread) {
    EXPECT_EXIT(std::thread([] { ::raise(SIGSEGV); }).join(), ExitedWithCode(0),
                RECORD_240 "\n(" RECORD_252 "\n)+");
}

TEST_F(CrashHandlerDeathTest, TracesStacksDeeperThanItsArrayWithoutHarm) {
    EXPECT_EXIT(CrashAt(300), ExitedWithCode(0), RECORD_240 "\n(" RECORD_252 "\n){200}");
    EXPECT_EXIT(CrashAt(2000), ExitedWithCode(0), RECORD_240 "\n(" RECORD_252 "\n){512}$");
}

TEST_F(CrashHandlerDeathTest, LeavesOtherSignalsAlone) {
    EXPECT_EXIT(::raise(SIGABRT), KilledBySignal(SIGABRT), "^$");
    EXPECT_EXIT(::raise(SIGTERM), KilledBySignal(SIGTERM), "^$");
}

TEST_F(CrashHandlerDeathTest, RunsWhatTheProcessDoesAtItsExit) {
    const auto crash = [] {
        std::atexit([] { std::cerr << "at exit" << std::endl; });
        ::raise(SIGSEGV);
    };
    EXPECT_EXIT(crash(), ExitedWithCode(0), RECORD_252 "\nat exit\n$");
}

TEST_F(CrashHandlerDeathTest, EndsAHandlerThatHangs) {
#ifdef __SANITIZE_THREAD__
    GTEST_SKIP() << "ThreadSanitizer blocks all signals while a handler runs";
#endif
    FakeLogger().hangs = true;
    EXPECT_EXIT(::raise(SIGSEGV), KilledBySignal(SIGALRM), RECORD_240);
}

TEST_F(CrashHandlerDeathTest, ExitsWithZeroWhenTheLoggerThrows) {
    FakeLogger().throws = Throws::Std;
    EXPECT_EXIT(::raise(SIGSEGV), ExitedWithCode(0), "^$");
}

TEST_F(CrashHandlerDeathTest, StaysInstalledWhenEnabledAgain) {
    MiniDump::EnableAutoStack("/other", "Other");
    EXPECT_EXIT(::raise(SIGSEGV), ExitedWithCode(0), RECORD_240);
    EXPECT_EXIT(
        {
            MiniDump::IsAlreadyRun();
            ::_exit(std::filesystem::exists(DIRECTORY / "Other.pid") ? 0 : 1);
        },
        ExitedWithCode(0), "");
}
