#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace reportctl::send {

/// Reads a file, pipe or terminal line by line, each as soon as it is there. Of a line that no datagram can
/// hold, only the beginning is kept, so that a file without line feeds takes no more memory than another one.
///
/// Does not own the descriptor. One thread.
class LineReader {
public:
    /// More than a datagram can hold: what is kept of a longer line is still refused by the system.
    static constexpr std::size_t KEPT_BYTES = std::size_t{64} * 1024;

    explicit LineReader(int descriptor) : m_descriptor(descriptor) {}

    /// Goes to the next line. False at the end, and when reading failed.
    bool Next();

    /// The line without its line feed, or its beginning. Stays until the next Next.
    const std::string& Text() const { return m_text; }

    /// How long the whole line is, without its line feed.
    std::uint64_t Bytes() const { return m_bytes; }

    bool IsWhole() const { return m_bytes == m_text.size(); }

    /// Whether reading ended before the end.
    bool HasFailed() const { return m_hasFailed; }

private:
    bool Fill();
    void Take(std::string_view part);

    int m_descriptor;
    std::array<char, std::size_t{64} * 1024> m_buffer{};
    std::string_view m_unread; ///< Of the buffer.
    std::string m_text;
    std::uint64_t m_bytes = 0;
    bool m_hasFailed = false;
};

} // namespace reportctl::send
