#include "Tools/reportctl/log/Follower.h"

#include <array>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Tools/reportctl/log/Files.h"

namespace reportctl::log {

Follower::Follower(std::string directory, const std::vector<std::string>& rotated)
    : m_directory(std::move(directory)), m_live(LiveFile(m_directory)),
      m_files(rotated.begin(), rotated.end()) {}

bool Follower::Next(std::string& line) {
    for (;;) {
        if (TakeLine(line))
            return true;
        if (!Fill() && !MoveOn())
            return false;
    }
}

bool Follower::TakeLine(std::string& line) {
    const auto end = m_unread.find('\n', m_taken);
    if (end == std::string::npos) {
        m_unread.erase(0, m_taken);
        m_taken = 0;
        return false;
    }
    line.assign(m_unread, m_taken, end - m_taken);
    m_taken = end + 1;
    return true;
}

/// Reads the next bytes of the open file. Returns false at its end.
bool Follower::Fill() {
    if (!m_file.IsOpen())
        return false;
    std::array<char, std::size_t{64} * 1024> buffer{};
    const auto size = ::read(m_file.Number(), buffer.data(), buffer.size());
    if (size <= 0)
        return false;
    m_unread.append(buffer.data(), static_cast<std::size_t>(size));
    return true;
}

/// Call it at the end of the open file. Returns true when there is more to read, in this file or in another.
bool Follower::MoveOn() {
    if (!m_isLive)
        return OpenNext();
    struct stat now {};
    if (::stat(m_live.c_str(), &now) != 0)
        return false; // the file was deleted or rotated: the service makes it again with its next record
    if (now.st_dev == m_device && now.st_ino == m_inode) {
        if (now.st_size >= ::lseek(m_file.Number(), 0, SEEK_CUR))
            return false;
        m_unread.clear(); // the file was cut, so everything in it now is new
        return ::lseek(m_file.Number(), 0, SEEK_SET) == 0;
    }
    if (Fill()) // lines that were written after we reached the end and before the rotation
        return true;
    return OpenNext();
}

/// Queues the rotated files that come after the open file, which has been read to its end.
void Follower::QueueSuccessors() {
    const auto files = RotatedFiles(m_directory);
    auto next = files.end();
    for (auto file = files.begin(); file != files.end(); ++file) {
        struct stat status {};
        if (::stat(file->c_str(), &status) == 0 && status.st_dev == m_device && status.st_ino == m_inode)
            next = file + 1;
    }
    m_files.assign(next, files.end());
}

bool Follower::OpenNext() {
    m_isLive = false;
    if (m_files.empty() && m_file.IsOpen())
        QueueSuccessors();
    while (!m_files.empty()) {
        const auto path = m_files.front();
        m_files.pop_front();
        if (Open(path)) // this fails when the file was deleted meanwhile, because the log was too large
            return true;
    }
    m_isLive = Open(m_live);
    return m_isLive;
}

bool Follower::Open(const std::string& path) {
    SystemTool::IO::Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK));
    struct stat status {};
    if (!file.IsOpen() || ::fstat(file.Number(), &status) != 0 || !S_ISREG(status.st_mode))
        return false;
    m_file = std::move(file);
    m_device = status.st_dev;
    m_inode = status.st_ino;
    m_unread.clear(); // half a line of the file before, whose rest does not come
    m_taken = 0;
    return true;
}

} // namespace reportctl::log
