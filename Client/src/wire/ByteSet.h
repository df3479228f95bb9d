#pragma once

#include <array>
#include <cstddef>
#include <string_view>

namespace hublink::wire {

/// A set of bytes; looking one up is a single step. The standard library's find_first_of searches the whole
/// set for each byte: with it, an event's JSON took as long as its datagram.
class ByteSet {
public:
    constexpr explicit ByteSet(std::string_view bytes) {
        for (const char byte : bytes)
            m_has[static_cast<unsigned char>(byte)] = true;
    }

    /// The same set, with the control characters.
    constexpr ByteSet AndControls() const {
        ByteSet set = *this;
        for (std::size_t control = 0; control < 0x20; ++control)
            set.m_has[control] = true;
        return set;
    }

    constexpr bool Has(char byte) const { return m_has[static_cast<unsigned char>(byte)]; }

    /// The position of the first byte of the set in the text, at or after `from`. The text's size when there
    /// is no such byte.
    std::size_t FindIn(std::string_view text, std::size_t from = 0) const {
        while (from < text.size() && !Has(text[from]))
            ++from;
        return from;
    }

private:
    std::array<bool, 256> m_has{};
};

} // namespace hublink::wire
