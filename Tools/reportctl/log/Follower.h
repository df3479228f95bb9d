#pragma once

#include <deque>
#include <string>
#include <string_view>
#include <vector>

#include <sys/types.h>

#include "SystemTool/IO/Descriptor.h"

namespace reportctl::log {

/// Reads the lines of the log in their order: those of the files that it is given, those of the live file,
/// and then, call after call, those that come. It reads a file that is rotated away to its end and goes on
/// with the ones after it; it goes on where a file was cut, with one that was deleted and made again, and
/// with one that is not there yet.
///
/// It only reads, and the service notices nothing of it. One thread.
class Follower {
public:
    /// `rotated` are the files to begin with, oldest first.
    Follower(std::string directory, const std::vector<std::string>& rotated);

    /// The next whole line, without its line feed. False when there is none now.
    bool Next(std::string& line);

    /// Whether the live file could be opened, so far.
    bool HasLiveFile() const { return m_isLive; }

private:
    bool TakeLine(std::string& line);
    bool Fill();
    bool MoveOn();
    bool OpenNext();
    bool Open(const std::string& path);
    void QueueSuccessors();

    std::string m_directory;
    std::string m_live;
    std::deque<std::string> m_files; ///< still to be read, before the live one
    SystemTool::IO::Descriptor m_file;
    dev_t m_device = 0;
    ino_t m_inode = 0;
    bool m_isLive = false; ///< m_file is the live file, as far as is known
    std::string m_unread;
    std::size_t m_taken = 0; ///< of m_unread
};

} // namespace reportctl::log
