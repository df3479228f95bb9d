#include "SystemTool/Text/EscapedText.h"

#include <cstdint>

#include "SystemTool/Text/Utf8.h"

namespace SystemTool::Text {

namespace {

using Byte = std::uint8_t;

bool IsPlain(Byte byte) {
    return byte >= 0x20 && byte < 0x7f && byte != '\\';
}

/// How many bytes at the start of `text` can be copied as they are. The inner loop has a fixed length and no
/// exit, so that the compiler makes vector instructions of it. A loop over single bytes took a third of the
/// time of a record.
std::size_t PlainLength(std::string_view text) {
    constexpr std::size_t BLOCK = 32;
    std::size_t length = 0;
    for (; length + BLOCK <= text.size(); length += BLOCK) {
        Byte odd = 0;
        for (std::size_t i = 0; i < BLOCK; ++i) {
            const auto byte = static_cast<Byte>(text[length + i]);
            odd = static_cast<Byte>(odd | (byte < 0x20) | (byte >= 0x7f) | (byte == '\\'));
        }
        if (odd != 0)
            break;
    }
    while (length < text.size() && IsPlain(static_cast<Byte>(text[length])))
        ++length;
    return length;
}

/// Whether the character makes a line look like something else. U+2028 and U+2029 end a line in some editors.
/// U+061C, U+200E, U+200F, U+202A to U+202E and U+2066 to U+2069 change the direction of text. U+200B to
/// U+200D, U+2060 to U+2064, U+FEFF and the tags U+E0000 to U+E007F are invisible. `character` is one whole
/// character in UTF-8.
bool ChangesTheLine(std::string_view character) {
    const auto isBetween = [character](std::string_view first, std::string_view last) {
        return character >= first && character <= last; // UTF-8 sorts in the order of the characters' numbers
    };
    switch (character.size()) {
    case 2:
        return character == "\u061c";
    case 3:
        if (character.front() != '\xe2') // the usual case first: this runs for each character
            return character == "\ufeff";
        return isBetween("\u200b", "\u200f") || isBetween("\u2028", "\u202e") ||
               isBetween("\u2060", "\u2064") || isBetween("\u2066", "\u2069");
    default:
        return isBetween("\U000E0000", "\U000E007F");
    }
}

/// The length of the readable character of more than one byte at the start of `text`; 0 when there is none.
std::size_t ReadableLength(std::string_view text) {
    const auto at = [text](std::size_t i) { return static_cast<Byte>(text[i]); };
    const auto length = SystemTool::Text::CharacterLength(text);
    const bool isControl = length == 2 && at(0) == 0xc2 && at(1) < 0xa0; // U+0080 to U+009F
    return length <= 1 || isControl || ChangesTheLine(text.substr(0, length)) ? 0 : length;
}

void AppendEscapedByte(LineBuffer& line, Byte byte) {
    static constexpr char DIGITS[] = "0123456789abcdef";
    switch (byte) {
    case '\\':
        return Append(line, "\\\\");
    case '\n':
        return Append(line, "\\n");
    case '\r':
        return Append(line, "\\r");
    case '\t':
        return Append(line, "\\t");
    default:
        const char code[] = {'\\', 'x', DIGITS[byte >> 4], DIGITS[byte & 0x0f]};
        return Append(line, {code, sizeof code});
    }
}

} // namespace

void AppendEscaped(LineBuffer& line, std::string_view text) {
    while (!text.empty()) {
        std::size_t length = PlainLength(text);
        while (length < text.size()) {
            const std::size_t character = ReadableLength(text.substr(length));
            if (character == 0)
                break;
            length += character;
        }
        Append(line, text.substr(0, length));
        text.remove_prefix(length);
        if (!text.empty() && !IsPlain(static_cast<Byte>(text.front()))) {
            AppendEscapedByte(line, static_cast<Byte>(text.front()));
            text.remove_prefix(1);
        }
    }
}

} // namespace SystemTool::Text
