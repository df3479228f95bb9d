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

#include <Poco/Format.h>

#include "Common/Common.h"

using SyncServiceReport::LogLevel;
using SyncServiceReport::WriteLog;

std::string MiniDump::m_strLogPath;
std::string MiniDump::m_strLogName;

namespace {

constexpr mode_t PID_FILE_MODE = 0666; // of every user's instance: the lock is the machine's

/// After this long in the handler, SIGALRM's default action ends the process. The fault may have come while
/// this very thread held a lock that the trace needs, the allocator's for one; a service that hangs there
/// would keep the instance lock and the port from its successor for ever. Long enough for a trace on a slow
/// disk.
constexpr unsigned CRASH_DEADLINE_SECONDS = 5;

constexpr std::size_t FRAME_ENTRIES = 64;
constexpr int FRAME_BYTES = FRAME_ENTRIES * sizeof(void*); // 512

/// Where the back trace goes. It is asked for with the array's size in bytes as the number of entries,
/// deliberately: the people who read the traces want the deep ones whole. A stack of more than 64 frames runs
/// over the array's end, and into the room behind it.
struct BackTrace {
    void* frames[FRAME_ENTRIES];
    void* overrun[FRAME_BYTES - FRAME_ENTRIES];
};

/// Locks the file; true, with the reason in errno, when another process holds the lock. One that fails for
/// another reason (a file system without locks) does not stop the service, deliberately.
bool IsLockedElsewhere(int file) {
    struct flock lock {};
    lock.l_type = F_WRLCK;
    lock.l_whence = SEEK_SET; // with start and length 0: the whole file, also beyond its end
    return ::fcntl(file, F_SETLK, &lock) < 0 && (errno == EACCES || errno == EAGAIN);
}

/// Writes this process's id in decimal; the result of write(2).
ssize_t WriteProcessId(int file) {
    char text[16] = {};
    std::snprintf(text, sizeof text, "%d", ::getpid());
    if (::ftruncate(file, 0) !=
        0) { // then some digits of an earlier, longer id may stay; the lock is what counts
    }
    return ::write(file, text, std::strlen(text));
}

} // namespace

void MiniDump::EnableAutoStack(const std::string& logPath, const std::string& logName) {
    m_strLogPath = logPath;
    m_strLogName = logName;
    ::signal(SIGSEGV, OnStackCallBack);
}

// exit is intended, also while other threads run, and this library's strerror has a text of its own for each
// thread.
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
    std::exit(0);       // 0 after a crash, deliberately: other codes mean that the service could not start
}

bool MiniDump::IsAlreadyRun() {
    ::umask(0);
    const std::string path = Poco::format("/Library/Preferences/hublink/%s.pid", m_strLogName);
    // Not truncated: an instance that loses must not wipe the winner's id. Not through a link: every user may
    // put one into that directory, and the file that it names would be emptied.
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
    return false; // the file stays open, and with it the lock
}

// NOLINTEND(concurrency-mt-unsafe)
