#pragma once

#include <cstddef>
#include <cstring>
#include <string_view>

namespace hublink::wire {

/// The room that the service has for one datagram. It cuts off what is longer.
inline constexpr std::size_t MAX_DATAGRAM_BYTES = 10240;

/// Puts a text together in the caller's memory, without an allocation. A piece that does not fit is dropped,
/// and the buffer remembers it: a caller appends everything and asks IsTooShort once, at the end.
class Buffer {
public:
    Buffer(char* begin, std::size_t capacity) : m_begin(begin), m_at(begin), m_end(begin + capacity) {}

    void Append(std::string_view text) {
        if (text.size() > static_cast<std::size_t>(m_end - m_at)) {
            m_isTooShort = true;
            return;
        }
        if (!text.empty()) // an empty text's data may be a null pointer
            std::memcpy(m_at, text.data(), text.size());
        m_at += text.size();
    }

    void Append(char byte) { Append(std::string_view(&byte, 1)); }

    bool IsTooShort() const { return m_isTooShort; }
    std::string_view Text() const { return {m_begin, static_cast<std::size_t>(m_at - m_begin)}; }

private:
    char* m_begin;
    char* m_at;
    char* m_end;
    bool m_isTooShort = false;
};

} // namespace hublink::wire
