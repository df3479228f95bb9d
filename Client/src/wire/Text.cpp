#include "wire/Text.h"

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "wire/ByteSet.h"

namespace hublink::wire {
namespace {

constexpr unsigned char Byte(char c) {
    return static_cast<unsigned char>(c);
}

/// The number of bytes at the start that are ASCII and not zero. Checks eight bytes at a time.
std::size_t PlainLength(std::string_view text) {
    constexpr std::uint64_t HIGH_BITS = 0x8080808080808080;
    constexpr std::uint64_t LOW_BITS = 0x0101010101010101;
    std::size_t length = 0;
    for (std::uint64_t eight = 0; text.size() - length >= sizeof eight; length += sizeof eight) {
        std::memcpy(&eight, text.data() + length, sizeof eight);
        if (((eight - LOW_BITS) & ~eight & HIGH_BITS) != 0 || (eight & HIGH_BITS) != 0)
            break;
    }
    while (length < text.size() && Byte(text[length]) < 0x80 && text[length] != '\0')
        ++length;
    return length;
}

bool IsContinuation(std::string_view text, std::size_t at) {
    return at < text.size() && (Byte(text[at]) & 0xc0) == 0x80;
}

/// The length of the character of two to four bytes at the start of the text; 0 when it is not valid.
std::size_t CharacterLength(std::string_view text) {
    const unsigned lead = Byte(text[0]);
    if (!IsContinuation(text, 1))
        return 0;
    const unsigned second = Byte(text[1]);
    if (lead >= 0xc2 && lead <= 0xdf)
        return 2;
    if (!IsContinuation(text, 2))
        return 0;
    if (lead >= 0xe0 && lead <= 0xef) // refuses overlong forms and surrogates
        return (lead == 0xe0 && second < 0xa0) || (lead == 0xed && second >= 0xa0) ? 0 : 3;
    if (lead >= 0xf0 && lead <= 0xf4 && IsContinuation(text, 3)) // refuses overlong forms and over U+10FFFF
        return (lead == 0xf0 && second < 0x90) || (lead == 0xf4 && second >= 0x90) ? 0 : 4;
    return 0;
}

/// The characters that AppendEscaped may write in another form.
constexpr ByteSet SPECIAL = ByteSet("\"\\'").AndControls();

void AppendControl(Buffer& buffer, char c) {
    constexpr std::string_view DIGITS = "0123456789abcdef";
    switch (c) {
    case '\n':
        return buffer.Append("\\n");
    case '\r':
        return buffer.Append("\\r");
    case '\t':
        return buffer.Append("\\t");
    default:
        buffer.Append("\\u00");
        buffer.Append(DIGITS[Byte(c) >> 4U]);
        buffer.Append(DIGITS[Byte(c) & 0x0fU]);
    }
}

void AppendSpecial(Buffer& buffer, char c, Quotes quotes) {
    switch (c) {
    case '"':
        return buffer.Append("\\\"");
    case '\\':
        return buffer.Append("\\\\");
    case '\'':
        return buffer.Append(quotes == Quotes::Doubled ? "''" : "'");
    default:
        AppendControl(buffer, c);
    }
}

} // namespace

bool IsText(std::string_view text) {
    for (;;) {
        text.remove_prefix(PlainLength(text));
        if (text.empty())
            return true;
        const std::size_t length = CharacterLength(text);
        if (length == 0)
            return false;
        text.remove_prefix(length);
    }
}

void AppendEscaped(Buffer& buffer, std::string_view text, Quotes quotes) {
    for (;;) {
        const std::size_t end = SPECIAL.FindIn(text);
        buffer.Append(text.substr(0, end));
        if (end == text.size())
            return;
        AppendSpecial(buffer, text[end], quotes);
        text.remove_prefix(end + 1);
    }
}

} // namespace hublink::wire
