#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "Modules/BoostLogger/FileFailure.h"

namespace BoostLogger {

/// Makes the directory and its missing parents, each with mode 0700 under any umask. What exists keeps its
/// mode: it may hold other things than this log.
FileFailure MakeDirectory(const std::string& path);

/// The descriptor of the file that records go to, opened for appending; several processes may have the same
/// file open. Threads: one at a time.
class LiveFile {
public:
    LiveFile() = default;
    ~LiveFile() { Close(); }
    LiveFile(const LiveFile&) = delete;
    LiveFile& operator=(const LiveFile&) = delete;

    /// Opens, or makes, the file with mode 0600 under any umask; one with a wider mode is narrowed, since
    /// the records hold what users do. Symbolic links and anything but a regular file are refused. What was
    /// open before is closed, its lock given up, whether this succeeds or not.
    FileFailure Open(const std::string& path);

    bool IsOpen() const { return m_descriptor >= 0; }

    /// Whether `path` is known to be another file by now, or none: it was rotated by another process or
    /// deleted. Looks at the size of the file that is open, too.
    bool IsGoneFrom(const std::string& path);

    /// How many lines are appended between two looks at the size. So many may each writer go beyond a limit
    /// where several write at once.
    static constexpr unsigned LINES_PER_LOOK = 16;

    /// The size of the file, with what other processes appended until the last look.
    std::int64_t SizeBytes() const { return m_sizeBytes; }

    /// Looks at the size now.
    void LookAtSize();

    /// Appends the line, which ends in a newline, with one system call: it is in the file, as a whole and not
    /// torn by other writers, when this returns. Where only a part of it could be written, the next line
    /// starts with a newline, so that the two are not glued together.
    FileFailure Append(std::string_view line);

    /// The exclusive lock that is held while the file is rotated, until Unlock or Close. Waits 20 ms at most.
    FileFailure Lock();
    void Unlock();
    void Close();

private:
    FileFailure Examine();
    bool EndsInHalfLine() const;

    int m_descriptor = -1;
    std::int64_t m_sizeBytes = 0;
    unsigned m_lines = 0; ///< Appended; may run over.
    bool m_endsInHalfLine = false;
};

} // namespace BoostLogger
