#include "Tools/reportctl/log/Follower.h"

#include <algorithm>
#include <array>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Tools/reportctl/log/Files.h"

namespace reportctl::log {
namespace {

/// Four times the longest record: each byte of a text of 64 KiB may be an escape of four. More is a damaged
/// file.
constexpr std::size_t MOST_LINE_BYTES = std::size_t{1024} * 1024;

} // namespace

Follower::Follower(std::string directory, const std::vector<std::string>& rotated)
    : m_directory(std::move(directory)), m_live(LiveFile(m_directory)),
      m_files(rotated.begin(), rotated.end()) {
    const auto all = RotatedFiles(m_directory);
    if (!rotated.empty())
        m_read = NumberOf(rotated.front()).value_or(1) - 1;
    else if (!all.empty())
        m_read = NumberOf(all.back()).value_or(0);
    OpenNext();
}

bool Follower::Next(std::string& line) {
    for (;;) {
        if (TakeLine(line))
            return true;
        if (!Fill() && !MoveOn())
            return false;
    }
}

bool Follower::TakeLine(std::string& line) {
    const auto end = m_unread.find('\n', m_searched);
    if (end == std::string::npos) {
        m_unread.erase(0, m_taken);
        m_taken = 0;
        if (m_unread.size() > MOST_LINE_BYTES)
            m_unread.erase(0, m_unread.size() - 1); // the file is damaged; the line's end is still to come
        m_searched = m_unread.size();
        return false;
    }
    line.assign(m_unread, m_taken, end - m_taken);
    m_taken = end + 1;
    m_searched = m_taken;
    return true;
}

void Follower::ForgetUnread() {
    m_unread.clear();
    m_taken = 0;
    m_searched = 0;
}

/// Reads some more of the open file; false at its end.
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
        ForgetUnread(); // cut: what is in it now is new
        return ::lseek(m_file.Number(), 0, SEEK_SET) == 0;
    }
    if (Fill()) // lines that were written after we reached the end and before the rotation
        return true;
    return OpenNext();
}

/// The rotated files that came after the open one, which has been read to its end. It may itself have been
/// rotated, or deleted since for the log's bound, as well as some after it.
void Follower::QueueSuccessors() {
    m_files.clear();
    for (auto& file : RotatedFiles(m_directory)) {
        struct stat status {};
        const bool isThere = ::stat(file.c_str(), &status) == 0;
        const auto number = NumberOf(file).value_or(0);
        if (isThere && m_file.IsOpen() && status.st_dev == m_device && status.st_ino == m_inode) {
            m_read = number;
            m_files.clear();
        } else if (number > m_read) {
            m_files.push_back(std::move(file));
        }
    }
}

bool Follower::OpenNext() {
    m_isLive = false;
    if (OpenRotated())
        return true;
    QueueSuccessors();
    if (OpenRotated())
        return true;
    if (!Open(m_live))
        return false;
    QueueSuccessors(); // it may just have been rotated, and this be another one
    if (OpenRotated())
        return true;
    m_isLive = true;
    return true;
}

/// The first of the queued ones that is still there.
bool Follower::OpenRotated() {
    while (!m_files.empty()) {
        const auto path = m_files.front();
        m_files.pop_front();
        m_read = std::max(m_read, NumberOf(path).value_or(0));
        if (Open(path))
            return true;
    }
    return false;
}

bool Follower::Open(const std::string& path) {
    SystemTool::IO::Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK));
    struct stat status {};
    if (!file.IsOpen() || ::fstat(file.Number(), &status) != 0 || !S_ISREG(status.st_mode))
        return false;
    m_file = std::move(file);
    m_device = status.st_dev;
    m_inode = status.st_ino;
    ForgetUnread(); // a half line, which nothing will end
    return true;
}

} // namespace reportctl::log
