#include "channel/Listener.h"

#include <array>
#include <cerrno>
#include <charconv>
#include <cstddef>
#include <cstdio>
#include <cstring>
#include <string_view>

#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <unistd.h>

namespace hublink {
namespace {

/// Linux's tables of UDP sockets: of the calling thread's network namespace, and where that file does not
/// exist, of the process's.
constexpr std::array TABLES = {"/proc/thread-self/net/udp", "/proc/net/udp"};
constexpr std::size_t LINE_BYTES = 128;

/// An address and the service's port as the table writes them: the four bytes of the address as one number in
/// this machine's byte order.
class PrintedAddress {
public:
    explicit PrintedAddress(in_addr_t host) {
        const int length =
            std::snprintf(m_text.data(), m_text.size(), "%08X:%04X", htonl(host), unsigned{SERVICE_PORT});
        m_length = static_cast<std::size_t>(length);
    }
    std::string_view Text() const { return {m_text.data(), m_length}; }

private:
    std::array<char, 32> m_text{};
    std::size_t m_length = 0;
};

/// Returns the next word of the line and removes it from the line.
std::string_view TakeWord(std::string_view& line) {
    const auto begin = line.find_first_not_of(' ');
    if (begin == std::string_view::npos)
        return line = {};
    line.remove_prefix(begin);
    const auto word = line.substr(0, line.find(' '));
    line.remove_prefix(word.size());
    return word;
}

template <typename Number>
Number NumberOf(std::string_view word) {
    Number number = 0;
    std::from_chars(word.data(), word.data() + word.size(), number);
    return number;
}

/// Finds the listener in the table's lines; TakeLine gets them one after the other.
class Search {
public:
    void TakeLine(std::string_view line) {
        TakeWord(line); // number
        const std::string_view address = TakeWord(line);
        const bool isExact = address == m_loopback.Text();
        if (!isExact && (address != m_anyAddress.Text() || m_isExact))
            return;
        for (int other = 0; other < 5; ++other) // remote address, state, queues, timer, retransmissions
            TakeWord(line);
        const auto owner = NumberOf<uid_t>(TakeWord(line));
        TakeWord(line); // timeout
        const auto socket = NumberOf<std::uint64_t>(TakeWord(line));
        if (isExact && m_isExact && owner == ::geteuid()) // of several exact sockets, another user's counts
            return;
        for (int other = 0; other < 2; ++other) // references, address of the socket in the kernel
            TakeWord(line);
        m_isExact = isExact;
        m_listener = {true, owner, socket, NumberOf<std::uint64_t>(TakeWord(line))};
    }

    Listener Found() const { return m_listener; }

private:
    const PrintedAddress m_loopback{INADDR_LOOPBACK};
    const PrintedAddress m_anyAddress{INADDR_ANY};
    bool m_isExact = false; ///< The socket found is bound to 127.0.0.1 itself, so it gets our datagrams.
    Listener m_listener;
};

/// A file that is open for reading. The destructor closes it.
class File {
public:
    /// Opens the first of the paths that the system has and that this program may read.
    template <typename Paths>
    explicit File(const Paths& paths) {
        for (const char* path : paths)
            if (!IsOpen() && IsMissing())
                Open(path);
    }
    ~File() {
        if (IsOpen())
            ::close(m_descriptor);
    }
    File(const File&) = delete;
    File& operator=(const File&) = delete;

    bool IsOpen() const { return m_descriptor >= 0; }

    /// Whether no path could be opened, and another try would find the same. EMFILE, for example, goes away.
    bool IsMissing() const { return m_error == ENOENT || m_error == EACCES || m_error == EPERM; }

    ssize_t Read(char* to, std::size_t bytes) const {
        ssize_t count = 0;
        do
            count = ::read(m_descriptor, to, bytes);
        while (count < 0 && errno == EINTR);
        return count;
    }

private:
    void Open(const char* path) {
        m_descriptor = ::open(path, O_RDONLY | O_CLOEXEC);
        m_error = IsOpen() ? 0 : errno;
    }

    int m_descriptor = -1;
    int m_error = ENOENT;
};

/// Hands the complete lines in the first `bytes` of the buffer to `search`, and moves the incomplete rest to
/// the buffer's start. Returns the size of that rest.
std::size_t TakeLines(char* buffer, std::size_t bytes, Search& search) {
    std::string_view rest(buffer, bytes);
    for (auto end = rest.find('\n'); end != std::string_view::npos; end = rest.find('\n')) {
        search.TakeLine(rest.substr(0, end));
        rest.remove_prefix(end + 1);
    }
    std::memmove(buffer, rest.data(), rest.size());
    return rest.size();
}

} // namespace

Look FindListener() noexcept {
    const File table(TABLES);
    if (!table.IsOpen())
        return {table.IsMissing() ? Look::Outcome::NoTable : Look::Outcome::Failed, {}};
    std::array<char, 32 * LINE_BYTES> buffer; // NOLINT(*-member-init): written before it is read
    std::size_t kept = 0;
    Search search;
    for (;;) {
        const ssize_t count = table.Read(buffer.data() + kept, buffer.size() - kept);
        if (count < 0)
            return {Look::Outcome::Failed, {}};
        if (count == 0)
            return {Look::Outcome::Done, search.Found()};
        kept = TakeLines(buffer.data(), kept + static_cast<std::size_t>(count), search);
        if (kept == buffer.size()) // no line of this table has 4 KiB: it is another table
            return {Look::Outcome::NoTable, {}};
    }
}

} // namespace hublink
