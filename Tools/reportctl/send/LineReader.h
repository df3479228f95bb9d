#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace reportctl::send {

/// Reads a file, pipe or terminal line by line, each line as soon as it arrives. Of a line that is too long
/// for a datagram, it keeps only the beginning, so a file without line feeds needs no more memory than
/// another one.
///
/// Does not own the descriptor. One thread.
class LineReader {
public:
    /// More than a datagram can hold. So when the kept beginning of a longer line is sent, the system refuses
    /// it.
    static constexpr std::size_t KEPT_BYTES = std::size_t{64} * 1024;

    explicit LineReader(int descriptor) : m_descriptor(descriptor) {}

    /// Goes to the next line. Returns false at the end, and when reading failed.
    bool Next();

    /// The line without its line feed, or the beginning of a longer line. Valid until the next call of Next.
    const std::string& Text() const { return m_text; }

    /// The length of the whole line, without its line feed.
    std::uint64_t Bytes() const { return m_bytes; }

    bool IsWhole() const { return m_bytes == m_text.size(); }

    /// Whether an error ended the reading before the end.
    bool HasFailed() const { return m_hasFailed; }

private:
    bool Fill();
    void Take(std::string_view part);

    int m_descriptor;
    std::array<char, std::size_t{64} * 1024> m_buffer{};
    std::string_view m_unread; ///< The part of m_buffer that was not handed out yet.
    std::string m_text;
    std::uint64_t m_bytes = 0;
    bool m_hasFailed = false;
};

} // namespace reportctl::send
