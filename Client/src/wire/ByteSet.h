#pragma once

#include <array>
#include <cstddef>
#include <string_view>

namespace hublink::wire {

/// Some bytes, each looked up in one step. The standard library's find_first_of searches the whole set for
/// each byte, which made JSON cost an event as much as the datagram does.
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

    /// Where the first one stands in the text from there on; the text's size when there is none.
    std::size_t FindIn(std::string_view text, std::size_t from = 0) const {
        while (from < text.size() && !Has(text[from]))
            ++from;
        return from;
    }

private:
    std::array<bool, 256> m_has{};
};

} // namespace hublink::wire
