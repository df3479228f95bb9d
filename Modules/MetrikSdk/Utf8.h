#pragma once

#include <string>
#include <string_view>

#include <boost/nowide/utf/convert.hpp>

namespace MetrikSdk {

/// The text with every byte sequence that is no UTF-8 replaced by U+FFFD. One bad name must not make the
/// whole request unreadable.
inline std::string ValidUtf8(std::string_view text) {
    return boost::nowide::utf::convert_string<char>(text.data(), text.data() + text.size());
}

/// At most `maxBytes` of the text, ending at a whole character.
inline std::string CutUtf8(std::string_view text, std::size_t maxBytes) {
    if (text.size() <= maxBytes)
        return std::string(text);
    auto end = maxBytes;
    while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xc0) == 0x80)
        --end;
    return std::string(text.substr(0, end));
}

} // namespace MetrikSdk
