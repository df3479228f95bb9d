#include "App/MiniDump.h"

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include <execinfo.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Common/Common.h"

namespace Paths = SyncServiceReport::Paths;
using SyncServiceReport::LogLevel;
using SyncServiceReport::WriteLog;

std::string MiniDump::m_strLogPath;
std::string MiniDump::m_strLogName;

namespace {

constexpr mode_t PID_FILE_MODE = 0666; // one pid file serves the instances of all users

/// When the handler takes longer than this, the default action of SIGALRM ends the process. The fault may
/// have come while this thread held a lock that the trace needs, such as the allocator's. Without the alarm,
/// the service would hang there for ever and keep the instance lock and the port, so that no new service
/// could start. The time is long enough for a trace on a slow disk.
constexpr unsigned CRASH_DEADLINE_SECONDS = 5;

constexpr std::size_t FRAME_ENTRIES = 64;
constexpr int FRAME_BYTES = FRAME_ENTRIES * sizeof(void*); // 512

/// The memory for the back trace. We pass the size of `frames` in bytes (512) to backtrace as the number of
/// entries, deliberately: the people who read the traces want deep stacks whole. A stack of more than 64
/// frames runs over the end of `frames` into `overrun`.
struct BackTrace {
    void* frames[FRAME_ENTRIES];
    void* overrun[FRAME_BYTES - FRAME_ENTRIES];
};

/// Locks the file. True, with the reason in errno, when another process holds the lock. When the lock fails
/// for another reason (a file system without locks), the result is false, deliberately: that must not stop
/// the service.
bool IsLockedElsewhere(int file) {
    struct flock lock {};
    lock.l_type = F_WRLCK;
    lock.l_whence = SEEK_SET; // with start and length 0: the whole file, also beyond its end
    return ::fcntl(file, F_SETLK, &lock) < 0 && (errno == EACCES || errno == EAGAIN);
}

/// Writes this process's id in decimal; returns the result of write(2).
ssize_t WriteProcessId(int file) {
    char text[16] = {};
    std::snprintf(text, sizeof text, "%d", ::getpid());
    // When this fails, some digits of an earlier, longer id may stay. That is accepted: the lock decides.
    if (::ftruncate(file, 0) != 0) {
    }
    return ::write(file, text, std::strlen(text));
}

} // namespace

void MiniDump::EnableAutoStack(const std::string& logPath, const std::string& logName) {
    m_strLogPath = logPath;
    m_strLogName = logName;
    ::signal(SIGSEGV, OnStackCallBack);
}

// clang-tidy warns about exit and strerror here. exit is intended, also while other threads run. The C
// library's strerror keeps a text of its own for each thread.
// NOLINTBEGIN(concurrency-mt-unsafe)

void MiniDump::OnStackCallBack(int signal) {
    ::alarm(CRASH_DEADLINE_SECONDS);
    WriteLog({LogLevel::Error, "OnStackCallBack", 240}, "Signal[%d]", signal);
    BackTrace trace; // NOLINT(cppcoreguidelines-pro-type-member-init): backtrace fills what is read of it
    const int count = ::backtrace(trace.frames, FRAME_BYTES);
    char** symbols = ::backtrace_symbols(trace.frames, count);
    for (int i = 0; symbols != nullptr && i < count; ++i)
        WriteLog({LogLevel::Error, "OnStackCallBack", 252}, "[%s]", symbols[i]);
    std::free(symbols); // NOLINT(cppcoreguidelines-no-malloc): backtrace_symbols asks for it
    std::exit(0); // 0 after a crash, deliberately: every other code means that the service could not start
}

bool MiniDump::IsAlreadyRun() {
    ::umask(0);
    const std::string path = Paths::PidFile(Paths::SHARED, m_strLogName);
    // We do not truncate the file here: a second instance, which does not get the lock, must not erase the id
    // of the first. We do not follow a link: every user may put one into that directory, and the file that
    // the link names would be emptied.
    const int file = ::open(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW, PID_FILE_MODE);
    if (file < 0) {
        WriteLog({LogLevel::Info, "IsAlreadyRun", 304}, "Open file failed, error : %s", std::strerror(errno));
        std::exit(1);
    }
    if (IsLockedElsewhere(file)) {
        const char* const reason = std::strerror(errno);
        WriteLog({LogLevel::Info, "IsAlreadyRun", 318}, "%s already locked, error: %s", path, reason);
        ::close(file);
        return true;
    }
    if (WriteProcessId(file) < 0) {
        const char* const reason = std::strerror(errno);
        WriteLog({LogLevel::Info, "IsAlreadyRun", 330}, "Write file failed, file: %s, error: %s", path,
                 reason);
        ::close(file);
        std::exit(1);
    }
    return false; // the file stays open, and keeps the lock
}

// NOLINTEND(concurrency-mt-unsafe)
