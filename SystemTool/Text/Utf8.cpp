#include "SystemTool/Text/Utf8.h"

namespace SystemTool::Text {
namespace {

using Byte = std::uint8_t;

constexpr std::string_view REPLACEMENT = "\xef\xbf\xbd"; // U+FFFD
constexpr std::size_t LONGEST = 4;

/// How long the character that begins with `lead` must be, and which values its second byte may have. After
/// some lead bytes, fewer values are allowed than for other bytes: this excludes forms that are longer than
/// needed, surrogates, and values beyond Unicode. Length 0: no character begins with this byte.
struct Form {
    std::size_t length;
    Byte secondMin;
    Byte secondMax;
};

Form FormOf(Byte lead) {
    if (lead < 0x80)
        return {1, 0, 0};
    if (lead >= 0xc2 && lead <= 0xdf)
        return {2, 0x80, 0xbf};
    if (lead >= 0xe0 && lead <= 0xef)
        return {3, lead == 0xe0 ? Byte{0xa0} : Byte{0x80}, lead == 0xed ? Byte{0x9f} : Byte{0xbf}};
    if (lead >= 0xf0 && lead <= 0xf4)
        return {4, lead == 0xf0 ? Byte{0x90} : Byte{0x80}, lead == 0xf4 ? Byte{0x8f} : Byte{0xbf}};
    return {0, 0, 0};
}

} // namespace

std::size_t CharacterLength(std::string_view text) {
    const auto at = [text](std::size_t i) { return static_cast<Byte>(text[i]); };
    const Form form = FormOf(at(0));
    if (form.length <= 1)
        return form.length;
    if (text.size() < form.length || at(1) < form.secondMin || at(1) > form.secondMax)
        return 0;
    for (std::size_t i = 2; i < form.length; ++i)
        if (!IsContinuation(text[i]))
            return 0;
    return form.length;
}

std::string ValidUtf8(std::string_view text) {
    if (IsAscii(text))
        return std::string(text);
    std::string valid;
    valid.reserve(text.size());
    while (!text.empty()) {
        const auto length = CharacterLength(text);
        valid += length == 0 ? REPLACEMENT : text.substr(0, length);
        text.remove_prefix(length == 0 ? 1 : length);
    }
    return valid;
}

std::string_view CutUtf8(std::string_view text, std::size_t maxBytes) {
    if (text.size() <= maxBytes)
        return text;
    for (std::size_t back = 0; back < LONGEST && back <= maxBytes; ++back)
        if (!IsContinuation(text[maxBytes - back]))
            return text.substr(0, maxBytes - back);
    return text.substr(0, maxBytes);
}

} // namespace SystemTool::Text
