#include "Modules/BoostLogger/LogWriter.h"

#include <algorithm>
#include <cerrno>
#include <string>

#include <sys/resource.h>

#include "Modules/BoostLogger/RecordLine.h"

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

/// Set while this thread waits for the writer's lock or holds it. The crash handler logs on the thread that
/// crashed. If that thread crashed in here, it would wait for the lock for ever, so its records are counted
/// as lost.
thread_local bool t_isInside = false;

struct Inside {
    Inside() { t_isInside = true; }
    ~Inside() { t_isInside = false; }
    Inside(const Inside&) = delete;
    Inside& operator=(const Inside&) = delete;
};

} // namespace

LogWriter::LogWriter(const LogSettings& settings)
    : m_settings(settings), m_path(settings.LivePath()), m_rotated(settings.directory, settings.fileName) {}

FileFailure LogWriter::Start() {
    const std::lock_guard lock(m_mutex);
    if (const FileFailure failure = Reopen())
        return failure;
    if (!m_live.Lock()) {
        Prune();
        m_live.Unlock();
    }
    return {};
}

void LogWriter::Append(std::string_view line, TimePoint now) noexcept {
    if (t_isInside)
        return CountLost();
    // Set before the lock is taken: a signal handler that logs in between would otherwise wait for ever.
    const Inside inside;
    const std::lock_guard lock(m_mutex);
    try {
        AppendLocked(line, now);
    } catch (...) { // no memory for the list of rotated files
        CountLost();
    }
}

void LogWriter::AppendLocked(std::string_view line, TimePoint now) {
    if (m_losing && now < m_nextAttempt)
        return CountLost();
    const FileFailure failure = Deliver(line, now);
    m_losing = static_cast<bool>(failure);
    if (!m_losing)
        return;
    CountLost();
    m_failure = failure;
    m_nextAttempt = now + RETRY_INTERVAL;
}

FileFailure LogWriter::Deliver(std::string_view line, TimePoint now) {
    if (const FileFailure failure = FollowPath(now))
        return failure;
    if (m_lost.load(std::memory_order_relaxed) > 0)
        if (const FileFailure failure = ReportLoss())
            return failure;
    return Put(line);
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
    if (const FileFailure failure = Put(TextOf(line)))
        return failure;
    m_lost.fetch_sub(lost, std::memory_order_relaxed);
    m_failure = {};
    return {};
}

FileFailure LogWriter::Put(std::string_view line) {
    const auto size = static_cast<std::int64_t>(line.size());
    if (m_systemLimit != NO_LIMIT)
        m_live.LookAtSize(); // before each line, because what another process appended counts, too
    if (m_live.SizeBytes() > 0 &&
        m_live.SizeBytes() + size > std::min(m_settings.maxFileBytes, m_systemLimit))
        if (const FileFailure failure = Rotate())
            return failure;
    if (size > m_systemLimit)
        return {EFBIG, "write to the file"};
    return m_live.Append(line);
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
