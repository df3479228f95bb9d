#include "Modules/BoostLogger/EscapedText.h"

#include <cstdint>

namespace BoostLogger {

namespace {

using Byte = std::uint8_t;

bool IsPlain(Byte byte) {
    return byte >= 0x20 && byte < 0x7f && byte != '\\';
}

bool IsContinuation(Byte byte) {
    return (byte & 0xc0) == 0x80;
}

/// How many bytes at the start of `text` can be copied as they are. The inner loop has a fixed length and no
/// exit, which the compiler turns into vector instructions; byte by byte this was a third of the cost of a
/// record.
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

/// The length that the UTF-8 character beginning with `lead` must have, and the range of its second byte,
/// which is narrower where longer forms, surrogates and values beyond Unicode would begin. Length 0: no lead
/// byte.
struct Form {
    std::size_t length;
    Byte secondMin;
    Byte secondMax;
};

Form FormOf(Byte lead) {
    if (lead == 0xc2) // C1 controls are its second bytes 0x80 to 0x9f
        return {2, 0xa0, 0xbf};
    if (lead > 0xc2 && lead <= 0xdf)
        return {2, 0x80, 0xbf};
    if (lead >= 0xe0 && lead <= 0xef)
        return {3, lead == 0xe0 ? Byte{0xa0} : Byte{0x80}, lead == 0xed ? Byte{0x9f} : Byte{0xbf}};
    if (lead >= 0xf0 && lead <= 0xf4)
        return {4, lead == 0xf0 ? Byte{0x90} : Byte{0x80}, lead == 0xf4 ? Byte{0x8f} : Byte{0xbf}};
    return {0, 0, 0};
}

/// U+2028 and U+2029 end a line in some editors; U+202A to U+202E and U+2066 to U+2069 turn the direction of
/// what follows, so that a line reads as what it is not.
bool ChangesTheLine(Byte lead, Byte second, Byte third) {
    return lead == 0xe2 && ((second == 0x80 && third >= 0xa8 && third <= 0xae) ||
                            (second == 0x81 && third >= 0xa6 && third <= 0xa9));
}

/// The length of the readable character of more than one byte at the start of `text`; 0 when there is none.
std::size_t CharacterLength(std::string_view text) {
    const auto at = [text](std::size_t i) { return static_cast<Byte>(text[i]); };
    const Form form = FormOf(at(0));
    if (form.length == 0 || text.size() < form.length || at(1) < form.secondMin || at(1) > form.secondMax)
        return 0;
    for (std::size_t i = 2; i < form.length; ++i)
        if (!IsContinuation(at(i)))
            return 0;
    return form.length == 3 && ChangesTheLine(at(0), at(1), at(2)) ? 0 : form.length;
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
            const std::size_t character = CharacterLength(text.substr(length));
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

std::string_view CutAtCharacter(std::string_view text, std::size_t maxBytes) {
    if (text.size() <= maxBytes)
        return text;
    constexpr std::size_t LONGEST = 4;
    for (std::size_t back = 0; back < LONGEST && back <= maxBytes; ++back)
        if (!IsContinuation(static_cast<Byte>(text[maxBytes - back])))
            return text.substr(0, maxBytes - back);
    return text.substr(0, maxBytes); // no UTF-8 at all there, so that no place is better than another
}

} // namespace BoostLogger
