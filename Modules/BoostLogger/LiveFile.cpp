#include "Modules/BoostLogger/LiveFile.h"

#include <cerrno>
#include <chrono>
#include <thread>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <unistd.h>

#include "SystemTool/IO/MakeDirectories.h"

namespace BoostLogger {

namespace {

constexpr mode_t FILE_MODE = 0600;

/// The other process holds the lock for one rename and a few unlinks. If that takes longer than these 20 ms,
/// the other process is stopped or its disk hangs. The caller must not hang with it.
constexpr int LOCK_ATTEMPTS = 20;
constexpr std::chrono::milliseconds LOCK_PAUSE{1};

} // namespace

FileFailure MakeDirectory(const std::string& path) {
    return {SystemTool::IO::MakeDirectories(path).error, "make the directory"};
}

FileFailure LiveFile::Open(const std::string& path) {
    Close();
    // O_NOFOLLOW: another program may plant a link under the log's name. We must not append to its target.
    // O_NONBLOCK: opening a pipe or a device must not wait. Examine refuses both. Regular files ignore it.
    // O_RDWR: EndsInHalfLine reads the last byte.
    m_descriptor =
        open(path.c_str(), O_RDWR | O_APPEND | O_CREAT | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY,
             FILE_MODE);
    if (!IsOpen())
        return {errno, "open the file"};
    const FileFailure failure = Examine();
    if (failure)
        Close();
    return failure;
}

FileFailure LiveFile::Examine() {
    struct stat status {};
    if (fstat(m_descriptor, &status) != 0)
        return {errno, "examine the file"};
    if (!S_ISREG(status.st_mode))
        return {EINVAL, "use what is no regular file"};
    if ((status.st_mode & 07777) != FILE_MODE)
        // This fails on a file of another user. Such a file is used with the mode that it has.
        static_cast<void>(fchmod(m_descriptor, FILE_MODE));
    m_sizeBytes = status.st_size;
    m_endsInHalfLine = EndsInHalfLine();
    return {};
}

/// A crash or a full disk leaves half a line at the end of the file. Another process's write that is under
/// way looks the same, because the file grows page by page. To tell the two apart, we set the mode again: the
/// kernel does that under the lock that a write holds, so the write is done when fchmod returns. If the size
/// is still the same, the half line is there to stay.
bool LiveFile::EndsInHalfLine() const {
    char last = '\n';
    if (m_sizeBytes == 0 || pread(m_descriptor, &last, 1, m_sizeBytes - 1) != 1 || last == '\n')
        return false;
    static_cast<void>(fchmod(m_descriptor, FILE_MODE));
    struct stat status {};
    return fstat(m_descriptor, &status) == 0 && status.st_size == m_sizeBytes;
}

bool LiveFile::IsGoneFrom(const std::string& path) {
    struct stat there {};
    struct stat ours {};
    if (lstat(path.c_str(), &there) != 0)
        return errno == ENOENT || errno == ENOTDIR;
    if (fstat(m_descriptor, &ours) != 0)
        return false;
    m_sizeBytes = ours.st_size;
    return ours.st_ino != there.st_ino || ours.st_dev != there.st_dev;
}

void LiveFile::LookAtSize() {
    if (struct stat status{}; fstat(m_descriptor, &status) == 0)
        m_sizeBytes = status.st_size;
}

FileFailure LiveFile::AppendLines(std::string_view& lines) {
    char newline = '\n';
    // writev takes its texts through pointers to non-const and does not change them.
    iovec parts[] = {{&newline, 1}, {const_cast<char*>(lines.data()), lines.size()}};
    const bool mends = m_endsInHalfLine;
    ssize_t written = 0;
    do {
        written = mends ? writev(m_descriptor, parts, 2) : write(m_descriptor, lines.data(), lines.size());
    } while (written < 0 && errno == EINTR);
    if (written < 0)
        return {errno, "write to the file"};
    KeepSize(written, lines.find('\n') + 1 == lines.size());
    const auto done = lines.substr(0, static_cast<std::size_t>(mends && written > 0 ? written - 1 : written));
    // We do not cut a half line off. Another process may have appended a line after it, and that line would
    // be cut off, too.
    m_endsInHalfLine = written == 0 ? mends : !done.empty() && done.back() != '\n';
    lines.remove_prefix(done.rfind('\n') + 1); // without one, npos + 1 is 0
    return lines.empty() ? FileFailure{} : FileFailure{ENOSPC, "write a whole line to the file"};
}

/// After an append, the file offset is the end of the file, so it counts what other processes appended.
/// Asking for the offset after each line took a sixth of the line's time, so we ask once in LINES_PER_LOOK
/// lines, and after each write of several lines.
void LiveFile::KeepSize(ssize_t written, bool isOneLine) {
    const bool looks = !isOneLine || ++m_lines % LINES_PER_LOOK == 0;
    m_sizeBytes = looks ? lseek(m_descriptor, 0, SEEK_CUR) : m_sizeBytes + written;
}

// They change the lock of the file, so neither is const. NOLINTBEGIN(readability-make-member-function-const)

FileFailure LiveFile::Lock() {
    for (int attempt = 0; attempt < LOCK_ATTEMPTS; ++attempt) {
        if (flock(m_descriptor, LOCK_EX | LOCK_NB) == 0)
            return {};
        if (errno != EWOULDBLOCK && errno != EINTR)
            break;
        std::this_thread::sleep_for(LOCK_PAUSE);
    }
    return {errno, "lock the file for its rotation"};
}

void LiveFile::Unlock() {
    flock(m_descriptor, LOCK_UN);
}

// NOLINTEND(readability-make-member-function-const)

void LiveFile::Close() {
    if (IsOpen())
        close(m_descriptor);
    m_descriptor = -1;
}

} // namespace BoostLogger
