#pragma once

#include <cstddef>
#include <cstring>
#include <string_view>

namespace hublink::wire {

/// What the service receives a datagram into; it cuts what is longer.
inline constexpr std::size_t MAX_DATAGRAM_BYTES = 10240;

/// A text that is put together in memory of the caller's, without an allocation. What no longer fits is
/// dropped, and remembered: a caller appends everything and asks once.
class Buffer {
public:
    Buffer(char* begin, std::size_t capacity) : m_begin(begin), m_at(begin), m_end(begin + capacity) {}

    void Append(std::string_view text) {
        if (text.size() > static_cast<std::size_t>(m_end - m_at)) {
            m_isTooShort = true;
            return;
        }
        if (!text.empty()) // whose data may be a null pointer
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
