#include "Tools/reportctl/send/LineReader.h"

#include <algorithm>
#include <cerrno>

#include <unistd.h>

namespace reportctl::send {

bool LineReader::Next() {
    m_text.clear();
    m_bytes = 0;
    while (!m_unread.empty() || Fill()) {
        const auto end = m_unread.find('\n');
        Take(m_unread.substr(0, end));
        if (end != std::string_view::npos) {
            m_unread.remove_prefix(end + 1);
            return true;
        }
        m_unread = {};
    }
    return m_bytes > 0 && !m_hasFailed; // the last line may lack its line feed
}

/// Reads the next bytes into the buffer. Returns false at the end, and when reading failed.
bool LineReader::Fill() {
    ssize_t count = 0;
    do {
        count = ::read(m_descriptor, m_buffer.data(), m_buffer.size());
    } while (count < 0 && errno == EINTR);
    m_hasFailed = count < 0;
    if (count > 0)
        m_unread = {m_buffer.data(), static_cast<std::size_t>(count)};
    return count > 0;
}

void LineReader::Take(std::string_view part) {
    m_text.append(part.substr(0, KEPT_BYTES - std::min(KEPT_BYTES, m_text.size())));
    m_bytes += part.size();
}

} // namespace reportctl::send
