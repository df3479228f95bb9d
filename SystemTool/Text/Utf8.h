#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>

/// UTF-8 in texts from outside. Pure functions, safe from any thread.
namespace SystemTool::Text {

/// Whether all bytes are ASCII, which is valid UTF-8. It tests eight bytes at a time, because almost every
/// text is ASCII and must be tested to its end.
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

/// The length of the character at the start of `text`, which must not be empty: 1 to 4 bytes, or 0 when no
/// valid character starts there. Forms that are longer than needed, halves of surrogate pairs and values
/// beyond Unicode are not valid.
std::size_t CharacterLength(std::string_view text);

/// The text with U+FFFD in place of each byte that is not part of a valid character.
std::string ValidUtf8(std::string_view text);

/// At most the first `maxBytes` of the text, cut at the end of a whole character. When the bytes at the limit
/// are not UTF-8, the text is cut at the limit itself.
std::string_view CutUtf8(std::string_view text, std::size_t maxBytes);

} // namespace SystemTool::Text
