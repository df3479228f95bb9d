#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>

/// UTF-8 in texts from outside. Pure functions, safe from any thread.
namespace SystemTool::Text {

/// Whether all bytes are ASCII, which is valid UTF-8. It looks at eight bytes at a time: almost every text is
/// ASCII.
inline bool IsAscii(std::string_view text) {
    constexpr std::uint64_t HIGH_BITS = 0x8080808080808080;
    std::uint64_t all = 0;
    for (; text.size() >= sizeof all; text.remove_prefix(sizeof all)) {
        std::uint64_t eight = 0;
        std::memcpy(&eight, text.data(), sizeof eight);
        all |= eight;
    }
    for (const char byte : text)
        all |= static_cast<unsigned char>(byte);
    return (all & HIGH_BITS) == 0;
}

/// Whether the byte is the second, third or fourth of a character.
inline bool IsContinuation(char byte) {
    return (static_cast<unsigned char>(byte) & 0xc0) == 0x80;
}

/// The length of the character at the start of `text`, which is not empty: 1 to 4 bytes, or 0 when no valid
/// character starts there. Longer forms than needed, halves of surrogate pairs and values beyond Unicode are
/// not valid.
std::size_t CharacterLength(std::string_view text);

/// The text with U+FFFD in place of each byte that is no part of a valid character.
std::string ValidUtf8(std::string_view text);

/// The first `maxBytes` of the text at most, ending at a whole character. Where the limit falls among bytes
/// that are no UTF-8, the text is cut at the limit.
std::string_view CutUtf8(std::string_view text, std::size_t maxBytes);

} // namespace SystemTool::Text
