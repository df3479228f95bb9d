#pragma once

#include <cstdint>
#include <deque>
#include <string>
#include <string_view>
#include <vector>

#include <sys/types.h>

#include "SystemTool/IO/Descriptor.h"

namespace reportctl::log {

/// Reads the lines of the log in their order: first those of the given rotated files, then those of the live
/// file, and in later calls the lines that were added since. When the live file is rotated, it is read to its
/// end before the files after it. Reading also goes on when the live file was cut, was deleted and made
/// again, or does not exist yet.
///
/// It only reads and does not affect the service. One thread.
class Follower {
public:
    /// `rotated`: the files to read first, oldest first. They must be the newest rotated files. The first
    /// file is open when this returns. Files that are rotated later are read, too.
    Follower(std::string directory, const std::vector<std::string>& rotated);

    /// Reads the next whole line, without its line feed. Returns false when there is none now.
    bool Next(std::string& line);

private:
    bool TakeLine(std::string& line);
    bool Fill();
    bool MoveOn();
    bool OpenNext();
    bool OpenRotated();
    bool Open(const std::string& path);
    void QueueSuccessors();
    void ForgetUnread();

    std::string m_directory;
    std::string m_live;
    std::deque<std::string> m_files; ///< still to be read, before the live one
    std::uint64_t m_read = 0;        ///< rotated files up to this number are read, or were not asked for
    SystemTool::IO::Descriptor m_file;
    dev_t m_device = 0;
    ino_t m_inode = 0;
    bool m_isLive = false; ///< m_file was the live file when it was opened
    std::string m_unread;
    std::size_t m_taken = 0;    ///< how many bytes of m_unread were handed out
    std::size_t m_searched = 0; ///< the bytes of m_unread before this place hold no further line end
};

} // namespace reportctl::log
