#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include <sys/types.h>

#include "Modules/BoostLogger/FileFailure.h"

namespace BoostLogger {

/// Makes the directory and its missing parents, each with mode 0700 under any umask. A directory that exists
/// keeps its mode, because it may hold other things than this log.
FileFailure MakeDirectory(const std::string& path);

/// The open file that records are appended to. Several processes may have the same file open. Threads: one at
/// a time.
class LiveFile {
public:
    LiveFile() = default;
    ~LiveFile() { Close(); }
    LiveFile(const LiveFile&) = delete;
    LiveFile& operator=(const LiveFile&) = delete;

    /// Opens the file, or makes it, with mode 0600 under any umask. A file with another mode gets this one,
    /// because the records hold what users do. Symbolic links and everything but a regular file are refused.
    /// The file that was open before is closed and its lock released, also when this fails.
    FileFailure Open(const std::string& path);

    bool IsOpen() const { return m_descriptor >= 0; }

    /// Whether `path` is known to lead to another file by now, or to none: another process has rotated or
    /// deleted our file. Also updates SizeBytes when there is a file at `path`.
    bool IsGoneFrom(const std::string& path);

    /// How many lines are appended between two looks at the size, at most. When several processes write at
    /// once, each of them may exceed a size limit by as many lines.
    static constexpr unsigned LINES_PER_LOOK = 16;

    /// The size of the file. It counts the bytes of other processes as of the last look.
    std::int64_t SizeBytes() const { return m_sizeBytes; }

    /// Updates SizeBytes now.
    void LookAtSize();

    /// Appends the lines, each of which ends in a newline, with one system call. When this returns without a
    /// failure, all lines are in the file, and no other process's text is in the middle of them. After a
    /// failure, `lines` holds the lines that are not in the file as a whole. When the file ends in half a
    /// line, the next call writes a newline first, so that the half line and the next line do not become one
    /// line.
    FileFailure AppendLines(std::string_view& lines);

    /// Appends one line, as AppendLines does.
    FileFailure Append(std::string_view line) { return AppendLines(line); }

    /// Takes the exclusive lock for a rotation. It is held until Unlock or Close. Waits 20 ms at most.
    FileFailure Lock();
    void Unlock();
    void Close();

private:
    FileFailure Examine();
    bool EndsInHalfLine() const;
    void KeepSize(ssize_t written, bool isOneLine);

    int m_descriptor = -1;
    std::int64_t m_sizeBytes = 0;
    unsigned m_lines = 0; ///< How many lines were appended; it may wrap around to 0.
    bool m_endsInHalfLine = false;
};

} // namespace BoostLogger
