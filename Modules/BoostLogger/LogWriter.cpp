#include "Modules/BoostLogger/LogWriter.h"

#include <algorithm>
#include <cerrno>
#include <string>

#include <pthread.h>
#include <sys/resource.h>

#include "Modules/BoostLogger/InsideLog.h"
#include "Modules/BoostLogger/RecordLine.h"
#include "SystemTool/Clock/LockBefore.h"

namespace BoostLogger {

namespace {

/// How long to wait after a failure. On a full disk, four attempts a second are as good as 300,000.
constexpr std::chrono::milliseconds RETRY_INTERVAL{250};

/// How long to wait between two looks at the path. In between, lines may go into a file that was deleted or
/// that another process has rotated away. A look before each line would take a third of the line's time.
constexpr std::chrono::milliseconds LOOK_INTERVAL{100};

/// The reason for lost records when no step on the files has failed.
const char* const NO_LINE = "out of memory, or logged by a signal handler inside the logger";

constexpr int WARNING = 3;

/// How long Finish waits for a thread that holds the lock. At the end of the process, that thread may never
/// run again.
constexpr std::chrono::milliseconds FINISH_PATIENCE{200};

/// How many forks lie between the first process and this one. A forked child has a copy of the waiting lines,
/// but the parent writes these lines. The child also has no Flusher thread, because fork copies only the
/// thread that calls it. A higher number than before tells a writer that it is in a child.
std::atomic<unsigned> g_forks = 0;

[[maybe_unused]] const int g_forkHandler = pthread_atfork(nullptr, nullptr, [] { ++g_forks; });

/// How many bytes the whole lines have that fit into `maxBytes`; 0 when no whole line fits.
std::size_t WholeLines(std::string_view lines, std::int64_t maxBytes) {
    if (maxBytes <= 0)
        return 0;
    if (lines.size() <= static_cast<std::uint64_t>(maxBytes))
        return lines.size();
    return lines.rfind('\n', static_cast<std::size_t>(maxBytes) - 1) + 1; // without one, npos + 1 is 0
}

std::uint64_t LinesIn(std::string_view lines) {
    return static_cast<std::uint64_t>(std::count(lines.begin(), lines.end(), '\n'));
}

} // namespace

LogWriter::LogWriter(const LogSettings& settings)
    : m_settings(settings), m_path(settings.LivePath()), m_forks(g_forks),
      m_rotated(settings.directory, settings.fileName) {}

FileFailure LogWriter::Start() {
    m_flusher.Start();
    const std::lock_guard lock(m_mutex);
    if (const FileFailure failure = Reopen())
        return failure;
    if (!m_live.Lock()) {
        Prune();
        m_live.Unlock();
    }
    return {};
}

bool LogWriter::IsForked() const {
    return m_forks != g_forks.load(std::memory_order_relaxed);
}

/// In a forked child, the mutex may be locked for ever: by a thread of the parent that was at work when the
/// child began. So a child waits for a short time only.
std::unique_lock<std::mutex> LogWriter::Lock() {
    if (IsForked())
        return SystemTool::Clock::LockBefore(m_mutex, std::chrono::steady_clock::now() + FINISH_PATIENCE);
    return std::unique_lock(m_mutex);
}

void LogWriter::Append(std::string_view line, TimePoint now, Haste haste) noexcept {
    if (InsideLog::IsThisThread())
        return CountLost();
    // Set before the lock is taken: a signal handler that logs in between would otherwise wait for ever.
    const InsideLog inside;
    const auto lock = Lock();
    if (!lock)
        return CountLost();
    if (IsForked()) {
        m_mayWait = false;
        m_waiting.Clear();
    }
    if (haste == Haste::MayWait && LetWait(line, now))
        return;
    WriteWaiting(now);
    Write(line, now);
}

/// Returns true when the line waits or was written together with waiting lines. Otherwise the caller must
/// write the line.
bool LogWriter::LetWait(std::string_view line, TimePoint now) {
    if (!m_mayWait || !m_waiting.Take(line, now))
        return false;
    if (m_waiting.AreDue(now) || !m_flusher.Notice())
        WriteWaiting(now);
    return true;
}

void LogWriter::Finish() noexcept {
    if (InsideLog::IsThisThread())
        return; // this thread crashed in here, and perhaps with the lock
    const InsideLog inside;
    const auto lock =
        SystemTool::Clock::LockBefore(m_mutex, std::chrono::steady_clock::now() + FINISH_PATIENCE);
    if (!lock)
        return;
    m_mayWait = false;
    if (!IsForked())
        WriteWaiting(std::chrono::steady_clock::now());
}

void LogWriter::WriteWaiting(TimePoint now) noexcept {
    if (!m_waiting.Due())
        return;
    Write(m_waiting.Text(), now);
    m_waiting.Clear();
}

void LogWriter::Write(std::string_view lines, TimePoint now) noexcept {
    if (m_losing && now < m_nextAttempt)
        return CountLost(LinesIn(lines));
    FileFailure failure;
    try {
        failure = Deliver(lines, now);
    } catch (...) { // no memory for the list of rotated files
        return CountLost(LinesIn(lines));
    }
    m_losing = static_cast<bool>(failure);
    if (!m_losing)
        return;
    CountLost(LinesIn(lines));
    m_failure = failure;
    m_nextAttempt = now + RETRY_INTERVAL;
}

/// Removes from `lines` those that are in the file. After a failure, `lines` holds those that are lost.
FileFailure LogWriter::Deliver(std::string_view& lines, TimePoint now) {
    if (const FileFailure failure = FollowPath(now))
        return failure;
    if (m_lost.load(std::memory_order_relaxed) > 0)
        if (const FileFailure failure = ReportLoss())
            return failure;
    return Put(lines);
}

FileFailure LogWriter::FollowPath(TimePoint now) {
    if (m_live.IsOpen() && now < m_nextLook)
        return {};
    m_nextLook = now + LOOK_INTERVAL;
    return m_live.IsOpen() && !m_live.IsGoneFrom(m_path) ? FileFailure{} : Reopen();
}

FileFailure LogWriter::Reopen() {
    m_live.Close();
    if (const FileFailure failure = MakeDirectory(m_settings.directory))
        return failure;
    m_systemLimit = FileSizeLimit();
    return m_live.Open(m_path);
}

/// The file size (`ulimit -f`) beyond which a write makes the system end the process, by SIGXFSZ. A log must
/// not end its program, and a plug-in must not change what the program does on a signal. So the writer itself
/// stays below the limit.
std::int64_t LogWriter::FileSizeLimit() {
    rlimit limit{};
    if (::getrlimit(RLIMIT_FSIZE, &limit) != 0 || limit.rlim_cur > static_cast<rlim_t>(NO_LIMIT))
        return NO_LIMIT;
    return static_cast<std::int64_t>(limit.rlim_cur);
}

FileFailure LogWriter::ReportLoss() {
    const std::uint64_t lost = m_lost.load(std::memory_order_relaxed);
    const std::string reason = m_failure ? m_failure.Text() : NO_LINE;
    const std::string message = std::to_string(lost) + " records could not be written: " + reason;
    LineBuffer line;
    ComposeLine(line, {WARNING, "", "Modules/BoostLogger", "ReportLoss", __LINE__, message},
                std::chrono::system_clock::now());
    std::string_view text = TextOf(line);
    if (const FileFailure failure = Put(text))
        return failure;
    m_lost.fetch_sub(lost, std::memory_order_relaxed);
    m_failure = {};
    return {};
}

FileFailure LogWriter::Put(std::string_view& lines) {
    while (!lines.empty()) {
        std::string_view part = Fitting(lines);
        if (part.empty() && m_live.SizeBytes() > 0) {
            if (const FileFailure failure = Rotate())
                return failure;
            part = Fitting(lines);
        }
        if (part.empty()) // a line that is too large for any file gets a file of its own
            part = lines.substr(0, lines.find('\n') + 1);
        if (static_cast<std::int64_t>(part.size()) > m_systemLimit)
            return {EFBIG, "write to the file"};
        const std::size_t before = part.size();
        const FileFailure failure = m_live.AppendLines(part);
        lines.remove_prefix(before - part.size());
        if (failure)
            return failure;
    }
    return {};
}

/// Those of `lines`, from the first on, that fit into the live file. Empty when the first line does not fit.
std::string_view LogWriter::Fitting(std::string_view lines) {
    if (m_systemLimit != NO_LIMIT)
        m_live.LookAtSize(); // before each write, because what another process appended counts, too
    const std::int64_t limit = std::min(m_settings.maxFileBytes, m_systemLimit);
    return lines.substr(0, WholeLines(lines, limit - m_live.SizeBytes()));
}

/// The lock is on the live file itself. A process that waited for the lock may find that the path leads to
/// another file by then: the rotation is done already. Opening the new file closes the old one and so
/// releases the lock.
FileFailure LogWriter::Rotate() {
    if (const FileFailure failure = m_live.Lock())
        return failure;
    if (!m_live.IsGoneFrom(m_path)) {
        if (m_live.SizeBytes() == 0) { // another program emptied it since the last look
            m_live.Unlock();
            return {};
        }
        if (const FileFailure failure = m_rotated.TakeIn(m_path)) {
            m_live.Unlock();
            return failure;
        }
        Prune();
    }
    return Reopen();
}

void LogWriter::Prune() {
    // The live file may grow to its full size until the next rotation, so that size is reserved for it.
    m_rotated.Prune(m_settings.maxTotalBytes - m_settings.maxFileBytes);
}

} // namespace BoostLogger
